#include "tools/tallyctl/export/exposition.h"

#include <cmath>
#include <limits>

#include "platform/number_text.h"
#include "platform/utf8.h"

namespace tbdaily {

namespace {

// Text that is no UTF-8, and U+0000, which some readers take for the end, is U+FFFD.
void appendEscaped(std::string& out, std::string_view value) {
  while (!value.empty()) {
    const char c = value.front();
    const std::size_t length = c == '\0' ? 0 : utf8CharacterLength(value);
    if (c == '\\' || c == '"')
      out.append("\\").append(1, c);
    else if (c == '\n')
      out += "\\n";
    else
      out += length == 0 ? kReplacementCharacter : value.substr(0, length);
    value.remove_prefix(length == 0 ? 1 : length);
  }
}

// name="value",name="value"
std::string textOf(MetricLabels labels) {
  std::string text;
  for (const MetricLabel& label : labels) {
    text.append(text.empty() ? "" : ",").append(label.name).append("=\"");
    appendEscaped(text, label.value);
    text += '"';
  }
  return text;
}

std::uint64_t saturatingSum(std::uint64_t a, std::uint64_t b) {
  return a + b < a ? std::numeric_limits<std::uint64_t>::max() : a + b;
}

}  // namespace

std::string metricNumber(double value) {
  if (std::isnan(value)) return "NaN";
  if (std::isinf(value)) return value < 0 ? "-Inf" : "+Inf";
  return realText(value);
}

bool Metric::begins(const std::string& labels) {
  if (!seen_.insert(labels).second) return false;
  if (seen_.size() > 1) return true;
  const std::string name(description_.name);
  text_.append("# HELP ").append(name).append(" ").append(description_.help).append("\n");
  text_.append("# TYPE ").append(name).append(" ").append(description_.type).append("\n");
  return true;
}

void Metric::line(std::string_view suffix, std::string_view labels, std::string_view number) {
  text_.append(description_.name).append(suffix);
  if (!labels.empty()) text_.append("{").append(labels).append("}");
  text_.append(" ").append(number).append("\n");
}

void Metric::addNumber(MetricLabels labels, const std::string& number) {
  const std::string text = textOf(labels);
  if (begins(text)) line("", text, number);
}

void Metric::add(MetricLabels labels, const MetricBuckets& buckets, double sum) {
  const std::string text = textOf(labels);
  if (!begins(text)) return;
  const std::string lead = text + (text.empty() ? "le=\"" : ",le=\"");
  std::uint64_t count = 0;
  for (const auto& [upper, values] : buckets) {
    count = saturatingSum(count, values);
    if (!std::isinf(upper)) line("_bucket", lead + metricNumber(upper) + "\"", std::to_string(count));
  }
  line("_bucket", lead + "+Inf\"", std::to_string(count));
  line("_sum", text, metricNumber(sum));
  line("_count", text, std::to_string(count));
}

}  // namespace tbdaily

// Metrics in the text that monitoring systems scrape, version 0.0.4 of its format.
#pragma once

#include <cstdint>
#include <initializer_list>
#include <map>
#include <set>
#include <string>
#include <string_view>

namespace tbdaily {

struct MetricDescription {
  std::string_view name;
  std::string_view type;  // "gauge"
  std::string_view help;  // one line
};

struct MetricLabel {
  std::string_view name;
  std::string_view value;  // any text
};
using MetricLabels = std::initializer_list<MetricLabel>;

// How many values lie above the bound before and up to this one, by the upper bound.
using MetricBuckets = std::map<double, std::uint64_t>;

// "NaN", "+Inf", "-Inf"; else the shortest text that reads back.
std::string metricNumber(double value);

// One metric with its samples, in the text that it appends to; nothing where it has none. Of two samples with
// the same labels the first counts.
class Metric {
 public:
  // Borrows the text.
  Metric(std::string& text, const MetricDescription& description) : text_(text), description_(description) {}

  void add(MetricLabels labels, double value) { addNumber(labels, metricNumber(value)); }
  void add(MetricLabels labels, std::int64_t value) { addNumber(labels, std::to_string(value)); }
  // A histogram with that sum of its values.
  void add(MetricLabels labels, const MetricBuckets& buckets, double sum);

 private:
  void addNumber(MetricLabels labels, const std::string& number);
  // The labels' text, behind the metric's head; empty when they had a sample before.
  bool begins(const std::string& labels);
  void line(std::string_view suffix, std::string_view labels, std::string_view number);

  std::string& text_;
  const MetricDescription& description_;
  std::set<std::string> seen_;
};

}  // namespace tbdaily

// Rows of a table as text for engines: tab-separated with a line of names, or one JSON object a line.
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace tbdaily {

enum class RowFormat : std::uint8_t { Tsv, Ndjson };

// The fields of a row come in the order of the columns, and all of them. Texts are UTF-8: what is none, and
// U+0000, which engines do not take, is U+FFFD.
class RowWriter {
 public:
  // Takes a piece of whole lines; false ends the writing.
  using Sink = std::function<bool(std::string_view lines)>;
  RowWriter(RowFormat format, std::span<const std::string_view> columns, Sink sink);

  // The fields that the rows from now on have in common, in the first columns.
  void share(std::span<const std::string_view> texts);

  void begin();
  void text(std::string_view text);
  void integer(std::int64_t value);
  // The shortest text that reads back; in JSON "nan", "inf" and "-inf" are texts.
  void real(double value);
  void end();

  // Hands what is left to the sink. Whether the sink took all.
  bool finish();
  // Whether the sink has taken all so far.
  bool isTaken() const { return isTaken_; }

 private:
  void lead();

  const RowFormat format_;
  const Sink sink_;
  std::vector<std::string> leads_;  // what stands before the field of each column
  std::string shared_;
  std::size_t sharedColumns_ = 0;
  std::size_t column_ = 0;  // the next one
  std::string out_;
  bool isTaken_ = true;
};

}  // namespace tbdaily

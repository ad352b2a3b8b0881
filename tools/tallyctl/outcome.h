// A value, or one line why there is none.
//
//   Outcome<PlistValue> read(...) { if (...) return Failure{"it is empty"}; return value; }
//   const auto list = read(...);
//   if (!list) return tool.fail(list.reason());
//   use(*list);
#pragma once

#include <optional>
#include <string>
#include <utility>
#include <variant>

namespace tbdaily {

struct Failure {
  std::string reason;  // one line
};

// The value of what is done for its effect.
using Nothing = std::monostate;

template <typename Value>
class [[nodiscard]] Outcome {
 public:
  Outcome(Value value) : value_(std::move(value)) {}
  Outcome(Failure failure) : reason_(std::move(failure.reason)) {}

  explicit operator bool() const { return value_.has_value(); }
  Value& operator*() { return *value_; }
  const Value& operator*() const { return *value_; }
  Value* operator->() { return &*value_; }
  const Value* operator->() const { return &*value_; }
  // Of a failure.
  const std::string& reason() const { return reason_; }

 private:
  std::optional<Value> value_;
  std::string reason_;
};

}  // namespace tbdaily

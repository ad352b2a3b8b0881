#include "platform/plist/builder.h"

#include "platform/plist/limits.h"

namespace tbdaily {

bool PlistBuilder::open(Container kind) {
  if (open_.size() == kPlistNestingLimit) return false;
  open_.emplace_back().kind = kind;
  return true;
}

void PlistBuilder::setKey(std::string_view key) {
  open_.back().key = key;
  open_.back().hasKey = true;
}

void PlistBuilder::add(PlistValue value) {
  if (open_.empty()) {
    root_ = std::move(value);
  } else if (OpenContainer& container = open_.back(); container.kind == Container::Dictionary) {
    container.entries.emplace_back(container.key, std::move(value));
    container.hasKey = false;
  } else {
    container.elements.push_back(std::move(value));
  }
}

void PlistBuilder::close() {
  OpenContainer container = std::move(open_.back());
  open_.pop_back();
  add(container.kind == Container::Dictionary
          ? PlistValue::dictionary(PlistDictionary(std::move(container.entries)))
          : PlistValue::array(std::move(container.elements)));
}

}  // namespace tbdaily

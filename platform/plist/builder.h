// Puts a structured value together from the events of a parser, which arrive in the order of the text.
#pragma once

#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/plist_value.h"

namespace tbdaily {

class PlistBuilder {
 public:
  enum class Container { Array, Dictionary };

  bool isOpen() const { return !open_.empty(); }  // a container is
  bool inDictionary() const { return isOpen() && open_.back().kind == Container::Dictionary; }
  bool hasKey() const { return isOpen() && open_.back().hasKey; }  // one that waits for its value
  bool hasRoot() const { return !root_.isNone(); }
  // Whether a value may come next.
  bool takesValue() const { return isOpen() ? !inDictionary() || hasKey() : !hasRoot(); }

  // False at the limit of nesting; nothing is opened then. Otherwise only where takesValue().
  bool open(Container kind);
  // Only in a dictionary.
  void setKey(std::string_view key);
  // Only where takesValue(). Values of the same key replace each other.
  void add(PlistValue value);
  // Only while a container is open and no key waits.
  void close();

  PlistValue takeRoot() { return std::move(root_); }

 private:
  struct OpenContainer {
    Container kind = Container::Array;
    bool hasKey = false;
    std::string key;
    PlistArray elements;
    std::vector<PlistDictionary::Entry> entries;
  };

  std::vector<OpenContainer> open_;
  PlistValue root_;
};

}  // namespace tbdaily

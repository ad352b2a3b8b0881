// A watch on the whole of a terminal.
#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "platform/plist_value.h"
#include "tools/tallyctl/metrics/watch_rows.h"

namespace tbdaily {

// As long as it lives it has the terminal's alternate screen, and what is written to standard error waits:
// both are given back at its end. One at a time.
class WatchScreen {
 public:
  // Null where standard input and output are no terminal that can be drawn on.
  static std::unique_ptr<WatchScreen> open(double interval);
  virtual ~WatchScreen() = default;

  // Draws a sample. `secondsAgo` is how long ago the one before was taken.
  virtual void show(PlistDate time, std::vector<ChannelValues> channels, double secondsAgo) = 0;
  // Does what the keys say that were pressed meanwhile; false when one of them ends the watch.
  [[nodiscard]] virtual bool takeKeys() = 0;
  virtual bool isPaused() const = 0;
};

}  // namespace tbdaily

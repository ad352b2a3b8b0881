// A process-wide run-once primitive that a test can open again.
#pragma once

#include <mutex>
#include <optional>
#include <utility>

namespace tbdaily {

class RunOnce {
 public:
  // Runs the function in the first call only; other threads wait until it has returned.
  template <typename Function>
  void run(Function&& function) {
    std::call_once(*flag_, std::forward<Function>(function));
  }
  // For tests: the next run is a first one again. No other thread may be inside run.
  void reset() { flag_.emplace(); }

 private:
  std::optional<std::once_flag> flag_{std::in_place};
};

}  // namespace tbdaily

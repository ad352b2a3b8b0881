// tallyctl wait: waits for the next post of a notification.

#include <poll.h>
#include <sys/inotify.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <array>
#include <cerrno>
#include <chrono>
#include <optional>

#include "platform/linux/base/file_io.h"
#include "platform/linux/base/host_notes.h"
#include "platform/linux/linux_notifications.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

namespace {

using Clock = std::chrono::steady_clock;

// Sleeps until something happens in the watched folder or the time is over; answers whether something did.
bool waitForChange(int watcher, std::optional<Clock::time_point> deadline) {
  int timeout = -1;
  if (deadline) {
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(*deadline - Clock::now()).count();
    timeout = static_cast<int>(std::clamp<std::int64_t>(left, 0, 1'000'000'000));
  }
  pollfd polled{watcher, POLLIN, 0};
  if (::poll(&polled, 1, timeout) <= 0) return false;
  std::array<char, 4096> events;
  [[maybe_unused]] const ssize_t drained = ::read(watcher, events.data(), events.size());
  return true;
}

void waitForPost(Tool& tool, const std::string& name, std::optional<double> timeout) {
  if (!isSafeName(name)) return tool.fail("\"" + name + "\" is no notification name", kWrongUsage);
  if (!tool.hasUsableRoot()) return;
  const Host& host = tool.platform().host();
  const LinuxNotifications notifications(host);
  const std::string shown = host.files().place(LinuxNotifications::kFolder).native();
  DeviceFolder folder;
  if (const int error = host.files().makeFolder(LinuxNotifications::kFolder, folder); error != 0) {
    return tool.fail(shown + ": " + errorText(error));
  }
  const FileDescriptor watcher(::inotify_init1(IN_CLOEXEC | IN_NONBLOCK));
  if (!watcher.isOpen() ||
      ::inotify_add_watch(watcher.get(), folder.throughDescriptor(".").c_str(), IN_MOVED_TO) < 0) {
    return tool.fail(shown + " cannot be watched: " + errorText(errno));
  }
  std::optional<Clock::time_point> deadline;
  if (timeout)
    deadline =
        Clock::now() + std::chrono::duration_cast<Clock::duration>(std::chrono::duration<double>(*timeout));

  const std::uint64_t before = notifications.postCount(name);
  std::uint64_t posts = before;
  while (posts == before) {
    if (!waitForChange(watcher.get(), deadline) && deadline && Clock::now() >= *deadline) {
      return tool.fail("no post of " + name + " came in time");
    }
    posts = notifications.postCount(name);
  }
  if (tool.printedAsJson(
          PlistValue::dictionary({{"notification", PlistValue::string(name)},
                                  {"posts", PlistValue::int64(static_cast<std::int64_t>(posts))}}))) {
    return;
  }
  tool.out().line(name + " was posted (" + std::to_string(posts) + " posts so far)");
}

}  // namespace

void addWaitCommand(CLI::App& app, Tool& tool) {
  CLI::App* command = app.add_subcommand("wait", "Wait for the next post of a notification");
  auto name = std::make_shared<std::string>();
  auto timeout = std::make_shared<std::optional<double>>();
  command->add_option("NOTIFICATION", *name, "For example com.velmora.tallyd.tbdaily.logging")->required();
  command->add_option("--timeout", *timeout, "Give up after so many seconds")
      ->type_name("S")
      ->check(CLI::Range(0.0, 1e6));
  command->callback([&tool, name, timeout] { waitForPost(tool, *name, *timeout); });
}

}  // namespace tbdaily

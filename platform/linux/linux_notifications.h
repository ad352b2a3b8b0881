// Notifications as files: var/run/notifications/NAME holds the number of posts so far.
#pragma once

#include <cstdint>
#include <string_view>

#include "platform/linux/base/host.h"
#include "platform/notifications.h"

namespace tbdaily {

class LinuxNotifications : public Notifications {
 public:
  explicit LinuxNotifications(const Host& host) : host_(host) {}

  // Counts up and replaces the file atomically, so that a watcher of the folder sees every post.
  void post(std::string_view name) override;

  static constexpr std::string_view kFolder = "/var/run/notifications";
  // The number of posts so far; 0 before the first, or when the file holds no number.
  std::uint64_t postCount(std::string_view name) const;

 private:
  const Host& host_;
};

}  // namespace tbdaily

// What the contract tests have in common, the interfaces of all families among it. A subject is
// default-constructible and has `Platform& services`.
#pragma once

#include <gtest/gtest.h>

#include <chrono>
#include <cmath>
#include <limits>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <thread>
#include <utility>
#include <vector>

#include "platform/analytics_client.h"
#include "platform/analytics_history.h"
#include "platform/app_registry.h"
#include "platform/device_answers.h"
#include "platform/driver_registry.h"
#include "platform/dynamic_loader.h"
#include "platform/file_system.h"
#include "platform/kernel.h"
#include "platform/locale_settings.h"
#include "platform/log_submission.h"
#include "platform/message_digest.h"
#include "platform/notifications.h"
#include "platform/platform.h"
#include "platform/preferences_store.h"
#include "platform/property_list_codec.h"
#include "platform/service_listener.h"
#include "platform/stack_snapshot.h"
#include "platform/system_log.h"
#include "platform/usage_service.h"

namespace tbdaily::testing {

inline PlistData bytesOf(std::string_view text) {
  const auto bytes = std::as_bytes(std::span(text));
  return {bytes.begin(), bytes.end()};
}

template <typename Subject>
struct ContractTest : ::testing::Test {
  Subject subject;
  Platform& services = subject.services;
};

}  // namespace tbdaily::testing

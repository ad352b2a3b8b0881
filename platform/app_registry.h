// Installed applications.
//
// Absent registry: no bundles.
#pragma once

#include <cstdint>
#include <functional>
#include <string_view>

namespace tbdaily {

enum class BundleKind : std::uint8_t { Application = 1 };

class AppRegistry {
 public:
  virtual ~AppRegistry() = default;
  // Calls back once for each bundle, with its type, before it returns.
  virtual void enumerateBundles(BundleKind kind,
                                const std::function<void(std::string_view bundleType)>& bundle) = 0;
  virtual std::string_view userApplicationType() const = 0;
};

}  // namespace tbdaily

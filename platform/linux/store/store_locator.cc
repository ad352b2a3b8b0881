#include "platform/linux/store/store_locator.h"

namespace tbdaily {

AnalyticsStoreLocator analyticsStoreLocator(const Host& host, AnalyticsHome& home) {
  return [&host, &home]() -> std::optional<std::filesystem::path> {
    // A root that is not there holds no store, and none is made in its place: this names it.
    if (host.makeFolders(host.root()) != 0) return std::nullopt;
    const std::string* path = home.find().path;
    if (path == nullptr) return std::nullopt;
    return host.devicePath(analyticsDatabasePath(*path));
  };
}

}  // namespace tbdaily

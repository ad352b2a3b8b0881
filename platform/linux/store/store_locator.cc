#include "platform/linux/store/store_locator.h"

#include "platform/linux/base/host_notes.h"

namespace tbdaily {

StorePlace storePlaceOf(const DeviceFiles& files, std::string_view path) {
  const std::filesystem::path whole(path);
  StorePlace place;
  place.files = &files;
  place.folder = whole.parent_path().native();
  place.name = whole.filename().native();
  return place;
}

AnalyticsStoreLocator analyticsStoreLocator(const Host& host, AnalyticsHome& home) {
  return [&host, &home, condition = std::make_shared<StoreCondition>()]() -> std::optional<StorePlace> {
    // A root that is not there holds no store, and none is made in its place.
    if (const int error = host.files().examineRoot(); error != 0) {
      noteUnusableRoot(host.root(), error);
      return std::nullopt;
    }
    const AnalyticsHome::Answer found = home.find();
    if (found.path == nullptr) {
      noteOnce(
          "there is no place for the analytics store: the device has several users and no system group "
          "container (error " +
          std::to_string(found.error) + ")");
      return std::nullopt;
    }
    StorePlace place = storePlaceOf(host.files(), analyticsDatabasePath(*found.path));
    place.condition = condition;
    return place;
  };
}

}  // namespace tbdaily

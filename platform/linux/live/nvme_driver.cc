#include "platform/linux/live/nvme_driver.h"

#include <fcntl.h>

#include <algorithm>
#include <cerrno>
#include <ranges>

#include "platform/linux/base/host_notes.h"

namespace tbdaily {

namespace {

// The controllers of the recording; nothing without one.
std::optional<PlistValue> recordedControllers(Recordings& recordings) {
  PlistValue controllers = recordings.entry(recording::kNvme, "controllers");
  return controllers.asDictionary() != nullptr ? std::optional(std::move(controllers)) : std::nullopt;
}

bool takeRecordedPage(const PlistValue& recorded, NvmeHealthPage& page) {
  const auto bytes = recorded.asData();
  if (!bytes || bytes->size() != page.size()) return false;
  std::ranges::copy(*bytes, page.begin());
  return true;
}

int readController(const LiveDiscovery& discovery, const std::string& name, NvmeHealthPage& page) {
  const FileDescriptor controller(
      ::open(discovery.place(pathOf({"/dev", name})).c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY));
  return controller.isOpen() ? readNvmeHealth(controller.get(), page) : errno;
}

class NvmeSource : public LiveSource {
 public:
  NvmeSource(const LiveDiscovery& discovery, Recordings& recordings, NvmeController controller)
      : discovery_(discovery), recordings_(recordings), controller_(std::move(controller)) {}

  void read(Readings& readings) override {
    NvmeHealthPage page{};
    const auto recorded = recordedControllers(recordings_);
    const bool isRead = recorded ? takeRecordedPage(recorded->get(controller_.name), page)
                                 : readController(discovery_, controller_.name, page) == 0;
    if (!isRead) return;
    for (std::size_t i = 0; i < kNvmeFigures.size(); ++i) {
      const auto value = nvmeFigure(kNvmeFigures[i], page);
      if (controller_.slots[i] && value) readings[*controller_.slots[i]] = *value;
    }
  }

 private:
  const LiveDiscovery& discovery_;
  Recordings& recordings_;
  const NvmeController controller_;
};

NvmeController addController(LiveDiscovery& discovery, const std::string& recordedName,
                             const NvmeHealthPage& page) {
  NvmeController controller{recordedName, {}};
  const std::string name = liveName(recordedName);
  for (std::size_t i = 0; i < kNvmeFigures.size(); ++i) {
    const auto value = nvmeFigure(kNvmeFigures[i], page);
    if (!value) continue;
    controller.slots[i] = discovery.slot(*value);
    discovery.addSimple(name, {}, dotted({name, kNvmeFigures[i].name}), kNvmeFigures[i].unit,
                        {{*controller.slots[i]}});
  }
  return controller;
}

}  // namespace

std::vector<NvmeController> discoverNvme(LiveDiscovery& discovery, Recordings& recordings) {
  std::vector<NvmeController> controllers;
  if (const auto recorded = recordedControllers(recordings)) {
    const PlistDictionary entries = recorded->mutableDictionary();
    std::vector<std::string> names;
    for (const auto& [name, page] : entries) names.push_back(name);
    sortByNumber(names);
    for (const std::string& name : names) {
      NvmeHealthPage page{};
      if (takeRecordedPage(entries.get(name), page))
        controllers.push_back(addController(discovery, name, page));
      else
        noteOnce("the recording of the controller " + liveName(name) +
                 " is no health page of 512 bytes and is left out");
    }
    return controllers;
  }
  const NvmePages live = readNvmePages(discovery);
  for (const auto& [name, page] : live.pages) controllers.push_back(addController(discovery, name, page));
  std::string unread;
  for (const std::string& name : live.unread) unread.append(unread.empty() ? "" : ", ").append(name);
  if (!unread.empty())
    noteOnce("the health of " + unread +
             " cannot be read, which takes the rights of root; \"tallyctl capture --only nvme\" " +
             "as root records it");
  return controllers;
}

std::unique_ptr<LiveSource> openNvmeSource(const LiveDiscovery& discovery, Recordings& recordings,
                                           NvmeController controller) {
  return std::make_unique<NvmeSource>(discovery, recordings, std::move(controller));
}

NvmePages readNvmePages(const LiveDiscovery& discovery) {
  NvmePages found;
  for (const std::string& name : discovery.numbered("/dev", "nvme")) {
    NvmeHealthPage page{};
    if (readController(discovery, name, page) == 0)
      found.pages.emplace_back(name, page);
    else
      found.unread.push_back(name);
  }
  return found;
}

}  // namespace tbdaily

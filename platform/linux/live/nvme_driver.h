// The health of the NVMe controllers, from a recording or from the controllers themselves.
#pragma once

#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "platform/linux/live/live_discovery.h"
#include "platform/linux/live/nvme_health.h"
#include "platform/linux/replay/recordings.h"

namespace tbdaily {

// A controller whose page can be read, and the slot of each of its figures; none for one that it has not.
struct NvmeController {
  std::string name;  // "nvme0"; as it is recorded
  std::array<std::optional<Slot>, kNvmeFigures.size()> slots;
};

// Adds the channels of all controllers. Those that cannot be read are named once, in one line. The recording
// answers for all controllers where there is one.
std::vector<NvmeController> discoverNvme(LiveDiscovery& discovery, Recordings& recordings);

// Reads a controller's page in each update. Borrows the recordings.
std::unique_ptr<LiveSource> openNvmeSource(const LiveDiscovery& discovery, Recordings& recordings,
                                           NvmeController controller);

// The pages of this moment, of the live controllers alone; the names of those that cannot be read.
struct NvmePages {
  std::vector<std::pair<std::string, NvmeHealthPage>> pages;
  std::vector<std::string> unread;
};
NvmePages readNvmePages(const LiveDiscovery& discovery);

}  // namespace tbdaily

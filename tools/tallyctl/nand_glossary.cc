#include "tools/tallyctl/nand_glossary.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cstdint>
#include <cstdio>

#include "storage/nand_key_map.h"
#include "tools/tallyctl/key_selection.h"

namespace tbdaily {

namespace {

constexpr std::string_view kKeyPrefix = "com.velmora.NANDInfo.";

using enum NandUnit;

// By subject; within a subject in the order in which they are shown. Where one base begins with another, the
// longer one wins.
constexpr NandGlossaryRow kGlossary[] = {
    // clang-format off
    {"ExportVersion", "Device", Code, "Version of the statistics that the controller exports."},
    {"DriverVersion", "Device", Code, "Version of the storage driver; all ones when the controller does not say."},
    {"q7aFwVer", "Device", Code, "Firmware version of a Q7A controller."},
    {"nandDesc", "Device", Code, "The NAND parts that are built in, as the controller describes them."},
    {"BytesPerPage", "Device", Bytes, "Size of a flash page."},
    {"PagesPerVirtualBlock", "Device", Count, "Pages in a virtual block, which is erased as a whole."},
    {"BlocksPerVirtualBlock", "Device", Count, "Physical blocks that make up a virtual block."},
    {"NumVirtualBlocks", "Device", Count, "Virtual blocks of the device."},
    {"NumFreeVirtualBlocks", "Device", Count, "Virtual blocks that hold no data and wait to be written."},
    {"IntermediatePartitionSize", "Device", Count, "Size of the intermediate partition, where data is written before it moves on."},
    {"StaticDataSizeInMB", "Device", MiB, "Data that is seldom rewritten."},
    {"formatDaysSince2000", "Device", Weeks, "Weeks from the year 2000 to the last formatting, despite the name."},
    {"DemoMode", "Device", Code, "Whether the device is a demonstration unit."},
    {"lhotFullLap", "Device", Count, "Full laps of the search for rarely used data."},
    {"lhotSkipPercent", "Device", Percent, "Share of blocks that the search for rarely used data passed over."},
    {"NumLogicalReads", "Host traffic", Sectors, "Read by the host, in sectors of 4 KiB."},
    {"NumLogicalWrites", "Host traffic", Sectors, "Written by the host, in sectors of 4 KiB."},
    {"hostWritesDyn", "Host traffic", Sectors, "Host writes of data that changes often."},
    {"hostWritesStatic", "Host traffic", Sectors, "Host writes of data that seldom changes."},
    {"hostWritesMeta", "Host traffic", Sectors, "Host writes of file system metadata."},
    {"hostWritesPhoto", "Host traffic", Sectors, "Host writes of photos and the like."},
    {"SectorsPerHostFlow", "Host traffic", Sectors, "Written by the host in one of its write streams."},
    {"BandsPerHostFlow", "Host traffic", Count, "Bands filled by one of the host's write streams."},
    {"OverWritesPerHostFlow", "Host traffic", Count, "Overwrites in one of the host's write streams."},
    {"UnmapsPerHostFlow", "Host traffic", Count, "Data given up in one of the host's write streams."},
    {"NumFlushes", "Host traffic", Count, "Requests of the host to force everything to the flash."},
    {"NumFences", "Host traffic", Count, "Requests of the host to keep the order of writes."},
    {"NumHostChoke", "Host traffic", Count, "Times when the controller slowed the host down."},
    {"NumPhysicalReads", "Flash traffic", Sectors, "Read from the flash, in sectors of 4 KiB."},
    {"NumPhysicalWrites", "Flash traffic", Sectors, "Written to the flash, in sectors of 4 KiB."},
    {"NumPhysicalErases", "Flash traffic", Count, "Bands erased."},
    {"IntermediateBandErases", "Flash traffic", Count, "Bands of the intermediate partition erased."},
    {"NumIntermediateMoves", "Flash traffic", Count, "Moves out of the intermediate partition."},
    {"BandsPerInternalFlow", "Flash traffic", Count, "Bands filled by one of the controller's own write streams."},
    {"OverWritesPerInternalFlow", "Flash traffic", Count, "Overwrites in one of the controller's own write streams."},
    {"UnmapsPerInternalFlow", "Flash traffic", Count, "Data given up in one of the controller's own write streams."},
    {"PadSectorsPerHostFlow", "Flash traffic", Sectors, "Padding written in one of the host's write streams."},
    {"commitPadSectorsPerFlow", "Flash traffic", Sectors, "Padding written to complete a write in one of the streams."},
    {"PadSize", "Flash traffic", Count, "Paddings of one class of sizes."},
    {"numBisWrites", "Flash traffic", Count, "Writes of the controller's built-in self tests."},
    {"numFirmwareWrites", "Flash traffic", Count, "Firmware images written."},
    {"NumWearLevelOps", "Wear", Count, "Moves of data that spread the wear over all blocks."},
    {"HottestCycle", "Wear", Count, "Erase cycles of the most worn block."},
    {"ColdestCycle", "Wear", Count, "Erase cycles of the least worn block."},
    {"IntermediateHottestCycle", "Wear", Count, "Erase cycles of the most worn block of the intermediate partition."},
    {"IntermediateColdestCycle", "Wear", Count, "Erase cycles of the least worn block of the intermediate partition."},
    {"HighEnduranceBlockEraseCount", "Wear", Count, "Erases of the most worn high-endurance block."},
    {"ReadsBeforeErasure", "Wear", Count, "Blocks by how often they were read before they were erased, from so many reads on."},
    {"numGrownBad", "Wear", Count, "Blocks that went bad in use."},
    {"NumGCWrites", "Garbage collection", Sectors, "Rewritten to free blocks that hold little valid data."},
    {"NumGCPLWrites", "Garbage collection", Sectors, "Rewritten by garbage collection that may be interrupted."},
    {"NumLOnlyGCWrites", "Garbage collection", Sectors, "Rewritten by garbage collection of rarely used data alone."},
    {"NumOfAvoidedGCDueToTemp", "Garbage collection", Count, "Garbage collections put off since it was too hot or too cold."},
    {"gcDestinations", "Garbage collection", Count, "Blocks that garbage collection wrote to."},
    {"gcSlcDestinations", "Garbage collection", Count, "Blocks of the intermediate kind that garbage collection wrote to."},
    {"NumBandGetsLow", "Garbage collection", Count, "New bands taken while few were left."},
    {"NumBandGetsExtreme", "Garbage collection", Count, "New bands taken while almost none were left."},
    {"NumRefreshesTier", "Refresh", Count, "Bands rewritten for their age, of one tier."},
    {"NumRefreshesOnClockLoss", "Refresh", Count, "Bands rewritten since the clock was lost and their age was not known."},
    {"NumBandsRefreshedOnError", "Refresh", Count, "Bands rewritten since reading them needed correction."},
    {"NumClockLoss", "Refresh", Count, "Starts at which the clock had gone back."},
    {"NumPaddingsForAge", "Refresh", Count, "Bands closed by padding since they had been open for long."},
    {"AgeInducedWriteSectors", "Refresh", Sectors, "Written to refresh data for its age."},
    {"NodesFree", "Mapping", Count, "Free nodes of the table that maps addresses."},
    {"NodesTotal", "Mapping", Count, "Nodes of the table that maps addresses."},
    {"indmbUnitsTotal", "Mapping", Count, "Memory units shared by the mapping table and the cache."},
    {"indmbUnitsInd", "Mapping", Count, "Memory units that the mapping table has."},
    {"indmbUnitsCache", "Mapping", Count, "Memory units that the cache has."},
    {"indmbUnitsXfer", "Mapping", Count, "Memory units on their way between mapping table and cache."},
    {"indmbXferCountTo", "Mapping", Count, "Transfers of memory units to one side."},
    {"indmbAccumulatedTimeBetweenXfers", "Mapping", Milliseconds, "Time between transfers of memory units, summed up."},
    {"numMemChoke", "Memory pressure", Count, "Times when the controller ran short of memory."},
    {"memChokeDuration", "Memory pressure", Milliseconds, "Time for which the controller was short of memory."},
    {"maxMemChokeDuration", "Memory pressure", Milliseconds, "Longest time for which the controller was short of memory."},
    {"numMemExtreme", "Memory pressure", Count, "Times when the controller had almost no memory left."},
    {"memExtremeDuration", "Memory pressure", Milliseconds, "Time for which the controller had almost no memory left."},
    {"maxMemExtremeDuration", "Memory pressure", Milliseconds, "Longest time for which the controller had almost no memory left."},
    {"numPfail", "Errors", Count, "Failed writes to the flash."},
    {"numEfail", "Errors", Count, "Failed erases."},
    {"ueccReads", "Errors", Count, "Host reads that could not be corrected."},
    {"internalUeccs", "Errors", Count, "The controller's own reads that could not be corrected."},
    {"numCrossTempUecc", "Errors", Count, "Uncorrectable reads of data written at a very different temperature."},
    {"openBandReadFail", "Errors", Count, "Failed reads of bands that are still being written."},
    {"MetaMismatchReread", "Errors", Count, "Reads repeated since the metadata beside the data did not match."},
    {"NumMaintenanceRequests", "Errors", Count, "Requests to look after a block."},
    {"MaintenanceRequestsFailedErase", "Errors", Count, "Requests to look after a block, for a failed erase."},
    {"MaintenanceRequestsFailedProg", "Errors", Count, "Requests to look after a block, for a failed write."},
    {"MaintenanceRequestsFailedRead", "Errors", Count, "Requests to look after a block, for a failed read."},
    {"RD_openBandCount", "Read disturb", Count, "Open bands that were read so often that neighbouring data suffers."},
    {"RD_openBandNops", "Read disturb", Count, "Empty writes that close such an open band."},
    {"RD_closedBandEvictCount", "Read disturb", Count, "Closed bands moved since they were read so often."},
    {"RD_closedBandEvictSectors", "Read disturb", Sectors, "Moved out of closed bands that were read so often."},
    {"RD_closedBandFragmentCount", "Read disturb", Count, "Parts of closed bands moved since they were read so often."},
    {"RD_closedBandFragmentSectors", "Read disturb", Sectors, "Moved in parts out of closed bands that were read so often."},
    {"E2E_F2H_SL_Corr", "Data integrity", Count, "Corrected faults on the way from flash to host, small data."},
    {"E2E_F2H_SL_UECC", "Data integrity", Count, "Uncorrectable faults on the way from flash to host, small data."},
    {"E2E_F2H_SL_LBA", "Data integrity", Count, "Wrong addresses on the way from flash to host, small data."},
    {"E2E_F2H_VL_Corr", "Data integrity", Count, "Corrected faults on the way from flash to host, large data."},
    {"E2E_F2H_VL_UECC", "Data integrity", Count, "Uncorrectable faults on the way from flash to host, large data."},
    {"E2E_F2H_VL_LBA", "Data integrity", Count, "Wrong addresses on the way from flash to host, large data."},
    {"E2E_H2F_SL_Corr", "Data integrity", Count, "Corrected faults on the way from host to flash, small data."},
    {"E2E_H2F_SL_UECC", "Data integrity", Count, "Uncorrectable faults on the way from host to flash, small data."},
    {"E2E_H2F_SL_LBA", "Data integrity", Count, "Wrong addresses on the way from host to flash, small data."},
    {"E2E_H2F_VL_Corr", "Data integrity", Count, "Corrected faults on the way from host to flash, large data."},
    {"E2E_H2F_VL_UECC", "Data integrity", Count, "Uncorrectable faults on the way from host to flash, large data."},
    {"E2E_H2F_VL_LBA", "Data integrity", Count, "Wrong addresses on the way from host to flash, large data."},
    {"BitFlipAddr", "Data integrity", Code, "Where in the controller's memory a bit last flipped."},
    {"BitFlipCount", "Data integrity", Count, "Bits that flipped in the controller's memory."},
    {"BitFlipDupes", "Data integrity", Count, "Bits that flipped again at a place that is known."},
    {"SuccessfulReconstructionGC", "Reconstruction", Count, "Data restored from parity during garbage collection."},
    {"SuccessfulReconstructionNonGC", "Reconstruction", Count, "Data restored from parity at other times."},
    {"FailedReconstructionGC", "Reconstruction", Count, "Data that parity could not restore during garbage collection."},
    {"FailedReconstructionNonGC", "Reconstruction", Count, "Data that parity could not restore at other times."},
    {"InvalidParity", "Reconstruction", Count, "Parity that was not valid when it was needed."},
    {"AbortSkip_", "Reconstruction", Count, "Parity rebuilds given up since a read to verify failed."},
    {"raidFailedReadQParity", "Reconstruction", Count, "Failed reads of the second parity."},
    {"raidFailed", "Reconstruction", Count, "Reconstructions of one kind that failed."},
    {"raidSuccessful", "Reconstruction", Count, "Reconstructions of one kind that succeeded."},
    {"raidReconstructFailPartition", "Reconstruction", Count, "Reconstructions in one partition that failed."},
    {"raidReconstructSuccessPartition", "Reconstruction", Count, "Reconstructions in one partition that succeeded."},
    {"BandsMinTempHisto", "Temperature", Count, "Bands by the lowest temperature at which they were written, in ranges from low to high whose bounds the controller keeps to itself."},
    {"BandsMaxTempHisto", "Temperature", Count, "Bands by the highest temperature at which they were written, in ranges from low to high whose bounds the controller keeps to itself."},
    {"BandsDeltaTempHisto", "Temperature", Count, "Bands by the range of temperatures at which they were written, in ranges from low to high whose bounds the controller keeps to itself."},
    {"BandsCrossTempHisto", "Temperature", Count, "Bands by the difference between writing and reading temperature, in ranges from low to high whose bounds the controller keeps to itself."},
    {"BandsLifeTimeTempHisto", "Temperature", Count, "Bands written over the device's life, by temperature, in ranges from low to high whose bounds the controller keeps to itself."},
    {"wcacheDirtyAtFlush", "Write cache", Count, "Flushes by how much unwritten data they met."},
    {"wcacheWaitLogMs", "Write cache", Count, "Waits for the write cache by their length, each class twice the one before."},
    {"wcacheDSReads", "Write cache", Count, "Reads answered from data that waits to be sorted."},
    {"wcacheDS_SectorsCur", "Write cache", Sectors, "Data that waits to be sorted, now."},
    {"wcacheDS_SectorsMax", "Write cache", Sectors, "The most data that ever waited to be sorted."},
    {"wcacheDS_segsSortedLogSize", "Write cache", Count, "Sorted segments by their size, each class twice the one before."},
    {"wcacheDSOverWrLogSizeCnts", "Write cache", Count, "Overwrites in the write cache by their size, each class twice the one before."},
    {"wcacheDSOverWrSizeByFlow", "Write cache", Sectors, "Overwritten in the write cache, in one of the streams."},
    {"NumSleepOps", "Power", Count, "Times when the controller went to sleep."},
    {"UncleanBoots", "Power", Count, "Starts after power was lost without a shutdown."},
    {"VMFreezer.NumPhysicalWrites", "Freezer", Bytes, "Written to the flash by the thread that freezes memory."},
    {"VMFreezer.ErrorMessage", "Freezer", Code, "Why the freezer's writes are not known."},
    {"VMFreezer.Error", "Freezer", Code, "Set when the freezer's writes are not known."},
    {"ErrorMessage", "Device", Code, "Why the controller's statistics are not known."},
    {"Error", "Device", Code, "Set when the controller's statistics are not known."},
    // clang-format on
};

std::string_view numberAtEnd(std::string_view name) {
  const std::size_t last = name.find_last_not_of("0123456789");
  return last == std::string_view::npos ? name : name.substr(last + 1);
}

std::string scaled(double value, double step, std::initializer_list<const char*> units) {
  const char* const* unit = units.begin();
  while (value >= step && unit + 1 != units.end()) {
    value /= step;
    ++unit;
  }
  std::array<char, 48> text;
  const int length =
      std::snprintf(text.data(), text.size(), value < 10 ? "%.1f %s" : "%.0f %s", value, *unit);
  return {text.data(), static_cast<std::size_t>(length)};
}

std::string bytesText(double bytes) {
  return scaled(bytes, 1024, {"B", "KiB", "MiB", "GiB", "TiB", "PiB"});
}

}  // namespace

const NandGlossaryRow* findNandGlossary(std::string_view key) {
  const std::string_view name = withoutNandPrefix(key);
  const NandGlossaryRow* best = nullptr;
  for (const NandGlossaryRow& row : kGlossary) {
    if (name.starts_with(row.base) && (best == nullptr || row.base.size() > best->base.size())) best = &row;
  }
  return best;
}

std::vector<std::string> nandGlossaryKeys() {
  std::vector<std::string> keys;
  for (const NandGlossaryRow& row : kGlossary) keys.emplace_back(row.base);
  return keys;
}

std::vector<std::string_view> nandGlossaryGroups() {
  std::vector<std::string_view> groups;
  for (const NandGlossaryRow& row : kGlossary) {
    if (std::find(groups.begin(), groups.end(), row.group) == groups.end()) groups.push_back(row.group);
  }
  return groups;
}

std::vector<const NandGlossaryRow*> nandGlossaryGroup(std::string_view name) {
  std::vector<const NandGlossaryRow*> rows;
  for (const NandGlossaryRow& row : kGlossary) {
    if (equalsIgnoringCase(row.group, name)) rows.push_back(&row);
  }
  return rows;
}

std::string_view withoutNandPrefix(std::string_view key) {
  return key.starts_with(kKeyPrefix) ? key.substr(kKeyPrefix.size()) : key;
}

std::optional<std::size_t> nandSeriesNumber(const NandGlossaryRow& row, std::string_view key) {
  const std::string_view rest = withoutNandPrefix(key).substr(row.base.size());
  std::size_t number = 0;
  const auto [end, error] = std::from_chars(rest.data(), rest.data() + rest.size(), number);
  if (error != std::errc() || end != rest.data() + rest.size()) return std::nullopt;
  return number;
}

bool isNandHistogram(const NandGlossaryRow& row) {
  return row.base.ends_with("TempHisto");
}

std::optional<std::string> explainNandKey(std::string_view key) {
  const NandGlossaryRow* row = findNandGlossary(key);
  if (row == nullptr) return std::nullopt;
  std::string sentence(row->sentence);
  const std::string_view rest = withoutNandPrefix(key).substr(row->base.size());
  if (rest.empty()) return sentence;
  const std::string_view number = numberAtEnd(rest);
  const std::string_view part = rest.substr(0, rest.size() - number.size());
  // Rows for several names of one kind answer only for those that there are.
  const bool isListed = std::any_of(keyMap.begin(), keyMap.end(), [key](const KeyMapRow& listed) {
    return withoutNandPrefix(listed.key) == withoutNandPrefix(key);
  });
  if (!part.empty() && !isListed) return std::nullopt;
  sentence.pop_back();
  if (!part.empty()) sentence.append(" (").append(part).append(")");
  if (!number.empty()) sentence.append(", number ").append(number);
  return sentence += '.';
}

std::string humanNandFigure(NandUnit unit, std::int64_t value) {
  if (value < 0) return {};
  const auto figure = static_cast<double>(value);
  switch (unit) {
    case Sectors:
      return bytesText(figure * 4096);
    case Bytes:
      return bytesText(figure);
    case MiB:
      return bytesText(figure * 1048576);
    case Milliseconds:
      return scaled(figure, 1000, {"ms", "s", "ks"});
    case Weeks:
      return std::to_string(value) + " weeks";
    case Percent:
      return std::to_string(value) + " %";
    case Count:
      return value >= 10000 ? scaled(figure, 1000, {"", "thousand", "million", "billion", "trillion"}) : "";
    case Code:
      return {};
  }
  return {};
}

}  // namespace tbdaily

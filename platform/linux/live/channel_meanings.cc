#include "platform/linux/live/channel_meanings.h"

#include <algorithm>
#include <array>

namespace tbdaily {

namespace {

// Names that begin and end so; of two rows for a name the first counts.
struct Meaning {
  std::string_view begin, end;
  std::string_view sentence;
};

constexpr std::array<Meaning, 47> kMeanings{{
    {"cpu", ".idle",
     "How often the processor entered each idle state and how long it stayed; deeper states save more power "
     "and take longer to "
     "leave."},
    {"cpu", ".time",
     "How long the processor ran programs (user, nice) and the kernel (system), was idle, waited for disks "
     "(iowait), served "
     "interrupts (irq, softirq), and waited while its host ran other machines (steal)."},
    {"policy", ".frequency", "How long the processors of this policy ran at each frequency."},
    {"pressure.cpu", ".some",
     "The time in which at least one task was ready to run and waited for a processor."},
    {"pressure.cpu", ".full",
     "The time in which all tasks of a group that were ready to run waited for a processor."},
    {"pressure.memory", ".some",
     "The time in which at least one task waited for memory to be freed or read back."},
    {"pressure.memory", ".full", "The time in which no task could run because all waited for memory."},
    {"pressure.io", ".some", "The time in which at least one task waited for a disk."},
    {"pressure.io", ".full", "The time in which no task could run because all waited for disks."},
    {"memory.swappedIn", "", "Bytes that were read back from swap space since the machine was started."},
    {"memory.swappedOut", "", "Bytes that were moved out to swap space since the machine was started."},
    {"memory.available", "",
     "What programs could take at this moment without swapping, as the kernel estimates it."},
    {"memory.majorFaults", "", "How often a program waited for a page that had to be read from a disk."},
    {"memory.outOfMemoryKills", "", "How many programs the kernel ended because memory had run out."},
    {"memory.corrected", "",
     "Errors of the memory that were put right; a growing number foretells others that are not."},
    {"memory.uncorrected", "", "Errors of the memory that could not be put right: data were lost."},
    {"disk.", "readBytes",
     "Bytes that were read from the disk, or from all disks, since the machine was started."},
    {"disk.", "writtenBytes",
     "Bytes that were written to the disk, or to all disks, since the machine was started."},
    {"disk.", "reads", "Reads that the disk, or all disks, finished."},
    {"disk.", "writes", "Writes that the disk, or all disks, finished."},
    {"disk.", "discards", "How often blocks were given back to the disk as unused."},
    {"disk.", "flushes", "How often the disk was told to make what it holds durable."},
    {"disk.", "busyTime", "The time in which the disk had something to do."},
    {"net.", "receivedBytes", "Bytes that came in through the interface, or through all that are hardware."},
    {"net.", "sentBytes", "Bytes that went out through the interface, or through all that are hardware."},
    {"net.", "receivedPackets", "Packets that came in through the interface."},
    {"net.", "sentPackets", "Packets that went out through the interface."},
    {"net.", "errors", "Packets that were damaged or could not be sent, in both directions."},
    {"net.", "drops", "Packets that were thrown away, in both directions, most often for want of room."},
    {"thermal.", ".temperature", "The temperature of a zone by which the kernel decides when to cool."},
    {"sensors.", "",
     "What a monitoring chip measures: a temperature, voltage, current, power, energy, or the turns of a "
     "fan."},
    {"power.", ".energy",
     "Energy that this part of the processor used; the count begins again at 0 when it is full."},
    {"nvme", ".criticalWarning",
     "Warnings of the drive as bits: 1 spare is low, 2 too hot or too cold, 4 unreliable, 8 read only, 16 "
     "its backup of volatile "
     "memory failed, 32 persistent memory is read only."},
    {"nvme", ".availableSpare", "Spare blocks that are left, in percent."},
    {"nvme", ".spareThreshold", "The percentage of spare below which the drive warns."},
    {"nvme", ".percentUsed", "How much of its life the maker thinks used, in percent; it may go beyond 100."},
    {"nvme", ".temperature", "The temperature that the drive goes by, in degrees Celsius."},
    {"nvme", ".readBytes", "Bytes that the host read from the drive in its life, in steps of 512,000."},
    {"nvme", ".writtenBytes", "Bytes that the host wrote to the drive in its life, in steps of 512,000."},
    {"nvme", ".readCommands", "Reads that the drive finished in its life."},
    {"nvme", ".writeCommands", "Writes that the drive finished in its life."},
    {"nvme", ".powerCycles", "How often the drive was switched on."},
    {"nvme", ".unsafeShutdowns", "How often the drive lost power without being told first."},
    {"nvme", ".mediaErrors", "How often the drive could not read back what it had stored: data were lost."},
    {"nvme", ".errorLogEntries", "Entries that the drive made in its log of errors, in its life."},
    {"nvme", ".busyTime", "The time in which the drive was at work on commands."},
    {"nvme", ".powerOnTime", "The time for which the drive was switched on."},
}};

}  // namespace

std::optional<std::string_view> channelMeaning(std::string_view name) {
  const auto found = std::ranges::find_if(kMeanings, [name](const Meaning& meaning) {
    return name.starts_with(meaning.begin) && name.ends_with(meaning.end);
  });
  return found != kMeanings.end() ? std::optional(found->sentence) : std::nullopt;
}

}  // namespace tbdaily

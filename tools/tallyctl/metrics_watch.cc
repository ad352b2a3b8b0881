#include "tools/tallyctl/metrics_watch.h"

#include <stdio_ext.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstdlib>

#include "platform/kernel.h"
#include "platform/linux/plist_json.h"
#include "platform/number_text.h"
#include "platform/platform.h"
#include "tools/tallyctl/metrics_json.h"
#include "tools/tallyctl/metrics_sampler.h"
#include "tools/tallyctl/metrics_view.h"
#include "tools/tallyctl/stop_signals.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

namespace {

using Clock = std::chrono::steady_clock;

Clock::duration durationOf(double seconds) {
  return std::chrono::duration_cast<Clock::duration>(std::chrono::duration<double>(seconds));
}

constexpr auto kProgressStep = std::chrono::milliseconds(100);

// The wait between two samples, with its progress where somebody looks at it.
Woken waitBetween(const StopSignals& signals, Clock::duration interval) {
  const Clock::time_point begin = Clock::now(), end = begin + interval;
  const auto step = ::isatty(STDERR_FILENO) != 0 ? Clock::duration(kProgressStep) : interval;
  Progress progress("measuring", static_cast<std::uint64_t>(interval.count()));
  Woken woken = Woken::InTime;
  for (Clock::time_point next = begin; woken == Woken::InTime && next < end;) {
    next = std::min(next + step, end);
    woken = signals.sleepUntil(next);
    progress.at(static_cast<std::uint64_t>((next - begin).count()));
  }
  return woken;
}

// The changes of the selected channels, or null, with the reason said.
KdReportCollection measure(Tool& tool, const ChannelCollection& channels, double interval) {
  ChannelSampler sampler(tool, channels);
  if (!sampler) return nullptr;
  const StopSignals signals;
  const KdReportCollection earlier = sampler.sample();
  if (!earlier) return nullptr;
  switch (waitBetween(signals, durationOf(interval))) {
    case Woken::Stopped:
      tool.fail("interrupted before the second sample");
      return nullptr;
    case Woken::ReaderGone:
      tool.fail("nobody reads standard output any more");
      return nullptr;
    case Woken::InTime:
      break;
  }
  const KdReportCollection later = sampler.sample();
  if (!later) return nullptr;
  std::optional<ReportError> error;
  KdReportCollection delta = KdReportCreateSamplesDelta(earlier.get(), later.get(), &error);
  if (!delta) failMetrics(tool, "the two samples cannot be compared", error);
  return delta;
}

bool canRedraw() {
  const char* terminal = std::getenv("TERM");
  return ::isatty(STDOUT_FILENO) != 0 && terminal != nullptr && *terminal != '\0' &&
         std::string_view(terminal) != "dumb";
}

constexpr std::string_view kClearScreen = "\x1b[H\x1b[2J";

void printSample(Tool& tool, const MetricsRequest& request, const ChannelCollection* samples, bool redraw) {
  Terminal& out = tool.out();
  if (redraw) out.print(kClearScreen);
  if (request.describe) return printDescriptions(tool, samples, ChannelContents::Values);
  const auto channels = readChannels(samples, ChannelContents::Values);
  if (!channels) return failMetrics(tool, "the channels cannot be read", std::nullopt);
  if (tool.options.json) return out.line(jsonText(channelsAsJson(*channels, ChannelContents::Values)));
  const PlistDate now = tool.platform().services().kernel.currentTime();
  if (!redraw) return out.line(valuesLine(now, *channels));
  out.line(stampText(now, 3));
  printValueTree(out, *channels);
}

// Whether what was printed has gone out. Who closes the pipe has seen enough, and nobody waits for the rest
// after a signal.
bool flushed(Tool& tool, const StopSignals& signals) {
  if (std::fflush(stdout) == 0 && std::ferror(stdout) == 0) return true;
  if (errno == EPIPE || signals.haveCome()) {
    ::__fpurge(stdout);
  } else {
    tool.fail("standard output cannot be written");
  }
  return false;
}

}  // namespace

void runMetricsDelta(Tool& tool, const MetricsRequest& request, double interval) {
  const ChannelSelection selection = selectChannels(tool, request.filter);
  if (hasNothingToShow(tool, request, selection)) return;
  if (const KdReportCollection delta = measure(tool, *selection.channels, interval))
    printChannels(tool, request, delta.get(), ChannelContents::Values);
}

void runMetricsWatch(Tool& tool, const MetricsRequest& request, double interval, std::uint64_t count) {
  const ChannelSelection selection = selectChannels(tool, request.filter);
  if (hasNothingToShow(tool, request, selection)) return;
  ChannelSampler sampler(tool, *selection.channels);
  if (!sampler) return;
  const StopSignals signals;
  const bool redraw = canRedraw() && !tool.options.json;
  Clock::time_point next = Clock::now();
  for (std::uint64_t taken = 1;; ++taken) {
    const KdReportCollection samples = sampler.sample();
    if (!samples) return;
    printSample(tool, request, samples.get(), redraw);
    if (!flushed(tool, signals) || tool.exitStatus != kDone || taken == count) return;
    // After a delay the samples go on from then, without a burst of those that were missed.
    next = std::max(next + durationOf(interval), Clock::now());
    if (signals.sleepUntil(next) != Woken::InTime) return;
  }
}

}  // namespace tbdaily

#include "tools/tallyctl/metrics/watch.h"

#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <map>

#include "platform/calendar.h"
#include "platform/kernel.h"
#include "platform/platform.h"
#include "tools/tallyctl/metrics/json.h"
#include "tools/tallyctl/metrics/sampler.h"
#include "tools/tallyctl/metrics/view.h"
#include "tools/tallyctl/stop_signals.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

using namespace kdreport;

namespace {

using Clock = std::chrono::steady_clock;

Clock::duration durationOf(double seconds) {
  return std::chrono::duration_cast<Clock::duration>(std::chrono::duration<double>(seconds));
}

constexpr auto kProgressStep = std::chrono::milliseconds(100);

// The wait between two samples, with its progress where somebody looks at it.
WaitEnd waitBetween(const StopSignals& signals, Clock::duration interval) {
  const Clock::time_point begin = Clock::now(), end = begin + interval;
  const auto step = ::isatty(STDERR_FILENO) != 0 ? Clock::duration(kProgressStep) : interval;
  Progress progress("measuring", static_cast<std::uint64_t>(interval.count()));
  WaitEnd woken = WaitEnd::Done;
  for (Clock::time_point next = begin; woken == WaitEnd::Done && next < end;) {
    next = std::min(next + step, end);
    woken = signals.sleepUntil(next);
    progress.at(static_cast<std::uint64_t>((next - begin).count()));
  }
  return woken;
}

// The first channel that cannot be compared, since one of them keeps all others from it; empty when none is
// found.
std::string incomparableChannel(const ChannelCollection* earlier, const ChannelCollection* later) {
  const auto keyOf = [](const ChannelRecord& channel) {
    return std::pair(KdReportChannelGetDriverID(&channel), KdReportChannelGetChannelID(&channel));
  };
  std::map<std::pair<std::int64_t, std::int64_t>, const ChannelRecord*> partners;
  KdReportIterate(earlier, [&](ChannelRecord& channel) {
    partners.emplace(keyOf(channel), &channel);
    return kKdReportKeep;
  });
  std::size_t place = 0;
  const std::uint32_t status = KdReportIterate(later, [&](ChannelRecord& channel) {
    const auto partner = partners.find(keyOf(channel));
    const bool stands =
        partner == partners.end() || KdReportSampleCreateDelta(partner->second, &channel) != nullptr;
    place += stands ? 1 : 0;
    return stands ? kKdReportKeep : kKdReportStop;
  });
  const auto channels = readChannels(later, ChannelContents::Description);
  return status == kKdReportStop && channels ? wholeName((*channels)[place]) : "";
}

// The changes of the selected channels, or null, with the reason said.
KdReportCollection measure(Tool& tool, const ChannelCollection& channels, double interval) {
  ChannelSampler sampler(tool, channels);
  if (!sampler) return nullptr;
  const StopSignals signals;
  const KdReportCollection earlier = sampler.sample();
  if (!earlier) return nullptr;
  if (const WaitEnd end = waitBetween(signals, durationOf(interval)); end != WaitEnd::Done) {
    tool.fail(end == WaitEnd::ReaderGone ? "nobody reads standard output any more"
                                         : "interrupted before the second sample");
    return nullptr;
  }
  const KdReportCollection later = sampler.sample();
  if (!later) return nullptr;
  std::optional<ReportError> error;
  KdReportCollection delta = KdReportCreateSamplesDelta(earlier.get(), later.get(), &error);
  if (delta) return delta;
  const std::string channel = incomparableChannel(earlier.get(), later.get());
  failMetrics(tool, "the two samples cannot be compared" + (channel.empty() ? "" : ", because of " + channel),
              error);
  return nullptr;
}

bool canRedraw() {
  const char* terminal = std::getenv("TERM");
  return ::isatty(STDOUT_FILENO) != 0 && terminal != nullptr && *terminal != '\0' &&
         std::string_view(terminal) != "dumb";
}

// The samples of a watch, one after another.
class SampleStream {
 public:
  SampleStream(Tool& tool, const MetricsRequest& request, const StopSignals& signals)
      : tool_(tool), request_(request), signals_(signals), redraws_(canRedraw() && !tool.options.json) {}

  WaitEnd show(const ChannelCollection* samples) const {
    if (request_.describe) return print(descriptionsText(samples, ChannelContents::Values));
    const auto channels = readChannels(samples, ChannelContents::Values);
    if (!channels) {
      failMetrics(tool_, "the channels cannot be read", std::nullopt);
      return WaitEnd::Stopped;
    }
    if (tool_.options.json) {
      JsonWriter json(JsonLayout::OneLine);
      writeChannels(json, *channels, ChannelContents::Values);
      return print(ShownText::lines(json.take() + "\n"));
    }
    const PlistDate now = tool_.platform().services().kernel.currentTime();
    if (!redraws_) return print(valuesLine(now, *channels) + ShownText::lines("\n"));
    tool_.out().print(Terminal::clearing());
    tool_.out().line(stampText(now, 3));
    printValueTree(tool_.out(), *channels);
    return std::fflush(stdout) == 0 ? WaitEnd::Done : WaitEnd::Failed;
  }

 private:
  WaitEnd print(const ShownText& text) const {
    return signals_.write((redraws_ ? Terminal::clearing() + text : text).bytes());
  }

  Tool& tool_;
  const MetricsRequest& request_;
  const StopSignals& signals_;
  const bool redraws_;
};

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
  const SampleStream stream(tool, request, signals);
  Clock::time_point next = Clock::now();
  WaitEnd end = WaitEnd::Done;
  for (std::uint64_t taken = 0; end == WaitEnd::Done;) {
    const KdReportCollection samples = sampler.sample();
    if (!samples) return;
    end = stream.show(samples.get());
    if (++taken == count || end != WaitEnd::Done) break;
    // After a delay the samples go on from then, without a burst of those that were missed.
    next = std::max(next + durationOf(interval), Clock::now());
    end = signals.sleepUntil(next);
  }
  // Who closes the pipe, or sends a signal, has seen enough.
  if (end == WaitEnd::Failed && !signals.haveCome()) tool.fail("standard output cannot be written");
}

}  // namespace tbdaily

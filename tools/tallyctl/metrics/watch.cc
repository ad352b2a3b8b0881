#include "tools/tallyctl/metrics/watch.h"

#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <map>
#include <utility>

#include "platform/kernel.h"
#include "platform/platform.h"
#include "tools/tallyctl/metrics/channel_text.h"
#include "tools/tallyctl/metrics/json.h"
#include "tools/tallyctl/metrics/sampler.h"
#include "tools/tallyctl/metrics/view.h"
#include "tools/tallyctl/metrics/watch_screen.h"
#include "tools/tallyctl/stop_signals.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

using namespace kdreport;

namespace {

using Clock = std::chrono::steady_clock;

Clock::duration durationOf(double seconds) {
  return std::chrono::duration_cast<Clock::duration>(std::chrono::duration<double>(seconds));
}

double secondsSince(Clock::time_point begin) {
  return std::chrono::duration<double>(Clock::now() - begin).count();
}

constexpr auto kProgressStep = std::chrono::milliseconds(100);

// The wait between two samples, with its progress where somebody looks at it.
WaitEnd waitBetween(const StopSignals& signals, Clock::duration interval) {
  const Clock::time_point begin = Clock::now(), end = begin + interval;
  const auto step = ::isatty(STDERR_FILENO) != 0 ? Clock::duration(kProgressStep) : interval;
  Progress progress("measuring", Progress::Of::Time, static_cast<std::uint64_t>(interval.count()));
  WaitEnd woken = WaitEnd::Done;
  for (Clock::time_point next = begin; woken == WaitEnd::Done && next < end;) {
    next = std::min(next + step, end);
    woken = signals.sleepUntil(next);
    progress.at(static_cast<std::uint64_t>((next - begin).count()));
  }
  return woken;
}

// Nothing, with the reason said, when the sample cannot be walked.
std::optional<std::vector<ChannelValues>> readSample(Tool& tool, const ChannelCollection* samples) {
  auto channels = readChannels(samples, ChannelContents::Values);
  if (!channels) failMetrics(tool, "the channels cannot be read", std::nullopt);
  return channels;
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

struct Changes {
  KdReportCollection delta;  // null, with the reason said, when they cannot be had
  double seconds = 0;        // that really passed
};

Changes measure(Tool& tool, const ChannelCollection& channels, double interval) {
  ChannelSampler sampler(tool, channels);
  if (!sampler) return {};
  const StopSignals signals;
  const KdReportCollection earlier = sampler.sample();
  if (!earlier) return {};
  const Clock::time_point begin = Clock::now();
  if (const WaitEnd end = waitBetween(signals, durationOf(interval)); end != WaitEnd::Done) {
    tool.fail(end == WaitEnd::ReaderGone ? "nobody reads standard output any more"
                                         : "interrupted before the second sample");
    return {};
  }
  const KdReportCollection later = sampler.sample();
  if (!later) return {};
  std::optional<ReportError> error;
  Changes changes{KdReportCreateSamplesDelta(earlier.get(), later.get(), &error), secondsSince(begin)};
  if (changes.delta) return changes;
  const std::string channel = incomparableChannel(earlier.get(), later.get());
  failMetrics(tool, "the two samples cannot be compared" + (channel.empty() ? "" : ", because of " + channel),
              error);
  return {};
}

// The samples of a watch, each a line or some of them.
class SampleLines {
 public:
  SampleLines(Tool& tool, const MetricsRequest& request, const StopSignals& signals)
      : tool_(tool), request_(request), signals_(signals) {}

  WaitEnd show(const ChannelCollection* samples) const {
    if (request_.describe) return signals_.write(descriptionsText(samples, ChannelContents::Values).bytes());
    const auto channels = readSample(tool_, samples);
    if (!channels) return WaitEnd::Stopped;
    if (tool_.options.json) {
      JsonWriter json(JsonLayout::OneLine);
      writeChannels(json, *channels, ChannelContents::Values);
      return signals_.write(ShownText::lines(json.take() + "\n").bytes());
    }
    const PlistDate now = tool_.platform().services().kernel.currentTime();
    return signals_.write((ShownText(valuesLine(now, *channels)) + ShownText::lines("\n")).bytes());
  }

 private:
  Tool& tool_;
  const MetricsRequest& request_;
  const StopSignals& signals_;
};

// When the samples of a watch are taken: one each interval, and after a delay from then on, without a burst
// of those that were missed.
class Schedule {
 public:
  Schedule(Clock::duration interval, std::uint64_t count) : interval_(interval), count_(count) {}

  Clock::time_point next() const { return next_; }
  void skip() { next_ = std::max(next_ + interval_, Clock::now()); }
  // After each sample: whether it was the last.
  bool isLast() { return ++taken_ == count_; }

 private:
  const Clock::duration interval_;
  const std::uint64_t count_;
  std::uint64_t taken_ = 0;
  Clock::time_point next_ = Clock::now();
};

WaitEnd watchInLines(ChannelSampler& sampler, const SampleLines& lines, const StopSignals& signals,
                     Schedule schedule) {
  for (;;) {
    const KdReportCollection samples = sampler.sample();
    if (!samples) return WaitEnd::Stopped;
    const WaitEnd shown = lines.show(samples.get());
    if (schedule.isLast() || shown != WaitEnd::Done) return shown;
    schedule.skip();
    if (const WaitEnd slept = signals.sleepUntil(schedule.next()); slept != WaitEnd::Done) return slept;
  }
}

void watchOnScreen(Tool& tool, ChannelSampler& sampler, WatchScreen& screen, const StopSignals& signals,
                   Schedule schedule) {
  Clock::time_point last = Clock::now();
  for (;;) {
    if (!screen.isPaused()) {
      const KdReportCollection samples = sampler.sample();
      auto channels = samples ? readSample(tool, samples.get()) : std::nullopt;
      if (!channels) return;
      const double seconds = secondsSince(std::exchange(last, Clock::now()));
      screen.show(tool.platform().services().kernel.currentTime(), std::move(*channels), seconds);
      if (schedule.isLast()) return;
    }
    schedule.skip();
    for (WaitEnd end = WaitEnd::Input; end != WaitEnd::Done;) {
      end = signals.sleepUntilInput(schedule.next());
      if (end == WaitEnd::Input ? !screen.takeKeys() : end != WaitEnd::Done) return;
    }
  }
}

}  // namespace

void runMetricsDelta(Tool& tool, const MetricsRequest& request, double interval) {
  const ChannelSelection selection = selectChannels(tool, request.filter);
  if (hasNothingToShow(tool, request, selection)) return;
  const Changes changes = measure(tool, *selection.channels, interval);
  if (!changes.delta) return;
  if (request.describe || tool.options.json)
    return printChannels(tool, request, changes.delta.get(), ChannelContents::Values);
  if (auto channels = readSample(tool, changes.delta.get()))
    printChanges(tool.out(), std::move(*channels), changes.seconds);
}

void runMetricsWatch(Tool& tool, const MetricsRequest& request, double interval, std::uint64_t count) {
  const ChannelSelection selection = selectChannels(tool, request.filter);
  if (hasNothingToShow(tool, request, selection)) return;
  ChannelSampler sampler(tool, *selection.channels);
  if (!sampler) return;
  const StopSignals signals;
  const Schedule schedule(durationOf(interval), count);
  if (!request.describe && !tool.options.json) {
    if (const auto screen = WatchScreen::open(interval))
      return watchOnScreen(tool, sampler, *screen, signals, schedule);
  }
  const WaitEnd end = watchInLines(sampler, SampleLines(tool, request, signals), signals, schedule);
  // Who closes the pipe, or sends a signal, has seen enough.
  if (end == WaitEnd::Failed && !signals.haveCome()) tool.fail("standard output cannot be written");
}

}  // namespace tbdaily

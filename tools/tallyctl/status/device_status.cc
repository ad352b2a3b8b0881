#include "tools/tallyctl/status/device_status.h"

#include <fcntl.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <array>
#include <cerrno>

#include "driver/daily_tasks.h"
#include "platform/file_system.h"
#include "platform/linux/base/host_notes.h"
#include "platform/linux/log_spool.h"
#include "platform/linux/store/store_locator.h"
#include "platform/platform.h"
#include "platform/preferences_store.h"
#include "tools/tallyctl/day_argument.h"
#include "tools/tallyctl/report/preview.h"
#include "tools/tallyctl/sizes.h"
#include "tools/tallyctl/store_copy.h"
#include "tools/tallyctl/whitelist_review.h"

namespace tbdaily {

namespace {

constexpr DayNumber kMostDaysBehind = 2;  // of the day that a run would process
constexpr std::uint64_t kLeastRoom = 16 << 20;

// What the job writes to; of those that are there.
constexpr std::array<std::string_view, 5> kWrittenFolders{"/", "/var/mobile",
                                                          "/var/mobile/Library/Preferences",
                                                          "/var/mobile/Library/Tallybook", LogSpool::kFolder};

class Examination {
 public:
  explicit Examination(LinuxPlatform& linux) : linux_(linux), platform_(linux.services()) {}

  DeviceStatus run() {
    found_.root = linux_.host().root().native();
    found_.today = platform_.analyticsClient.currentDayNumber();
    examineRoot();
    examineDays();
    found_.consent = platform_.preferences.getBoolean(kConsentKey, preference_domain::kLogSubmission).value;
    examineWhitelist();
    examineStore();
    examineSpool();
    foreseeNextRun();
    for (const std::string& line : linux_.host().files().unread()) need(line + ": correct it, or remove it");
    return std::move(found_);
  }

 private:
  void need(std::string line) { found_.attention.push_back(std::move(line)); }

  void examineRoot() {
    const DeviceFiles& files = linux_.host().files();
    for (const std::string_view path : kWrittenFolders) {
      DeviceFolder folder;
      if (files.openFolder(path, folder) != 0) continue;
      struct stat status {};
      const bool isOurs =
          ::fstat(folder.descriptor(), &status) == 0 && (::geteuid() == 0 || status.st_uid == ::geteuid());
      const bool isWritable = ::faccessat(folder.descriptor(), ".", W_OK, AT_EACCESS) == 0;
      if (!isWritable && (errno == EROFS || isOurs))
        return need(files.place(path).native() + " cannot be written (" + errorText(errno) +
                    "): a run leaves nothing there; make it writable for the user of the job");
    }
    struct statvfs space {};
    DeviceFolder root;
    if (files.openFolder("/", root) != 0 || ::fstatvfs(root.descriptor(), &space) != 0) return;
    const std::uint64_t room = std::uint64_t{space.f_bavail} * space.f_frsize;
    if (room < kLeastRoom)
      need("only " + sizeText(room) +
           " are left on the file system of the root: make room, for example with tallyctl " + "spool prune");
  }

  void examineDays() {
    bool valid = false;
    const std::int64_t last =
        platform_.preferences.getInteger(kLastProcessedDay, preference_domain::kJob, &valid);
    if (!valid) return;
    found_.lastDay = static_cast<DayNumber>(last);
    const std::int64_t behind = std::int64_t{found_.today} - 1 - last;
    if (behind > kMostDaysBehind)
      need("the last day that was processed is " + dayText(*found_.lastDay) + ", " + std::to_string(behind) +
           " days before yesterday: see why no run comes to its end (systemctl status tbdaily.timer "
           "tbdaily.service)");
    if (behind < 0)
      need("the last day that was processed is " + dayText(*found_.lastDay) +
           ", which is not over: no run does anything until then; check the clock, or run tbdaily -f");
  }

  void examineWhitelist() {
    const auto review = reviewWhitelist(platform_);
    const std::string place = linux_.host().files().place(kWhitelistPath).native();
    if (!review->config) {
      if (platform_.fileSystem.status(kWhitelistPath)) {
        const std::vector<std::string> errors = review->log.errors();
        return need("the whitelist " + place + " cannot be used (" +
                    (errors.empty() ? "cannot be loaded" : errors.front()) +
                    "): correct it; tallyctl whitelist check tries it");
      }
      found_.whitelist.problems.emplace_back("there is no whitelist");
      if (found_.lastDay)
        need("there is no whitelist at " + place + ": put one in place, since nothing is reported without");
      return;
    }
    found_.whitelist = {review->config->configFileDigest(), review->problems};
    if (review->isFault)
      need("the whitelist " + place +
           " has rules that cannot be read or options that are unknown: tallyctl whitelist "
           "check names them");
  }

  void examineStore() {
    StoreStatus& store = found_.store;
    const auto place = analyticsStoreLocator(linux_.host(), platform_.analyticsHome)();
    if (!place) {
      store.reason = "there is no place for it";
      return need(
          "the analytics store has no place: record the group container in System/Device/answers.plist");
    }
    auto copy = copyStore(*place);
    if (!copy) {
      store.reason = copy.reason();
      return need("the analytics store cannot be read: " + copy.reason());
    }
    if (!copy->file.isOpen()) {
      store.reason = "there is no store yet";
      if (found_.lastDay)
        need("the analytics store " + place->file().native() +
             " is gone: no report before something is recorded again; see who removed it");
      return;
    }
    for (const FileDescriptor* file : {&copy->file, &copy->log}) {
      struct stat status {};
      if (::fstat(file->get(), &status) == 0) store.bytes += static_cast<std::uint64_t>(status.st_size);
    }
    OpenedStore opened = openStoreCopy(std::move(copy->file), std::move(copy->log), *place);
    if (opened.result.ok()) opened.result = readDays(opened.database, *place);
    store.isUsable = opened.result.ok();
    if (store.isUsable) return;
    store.reason = opened.result.error;
    need("the analytics store cannot be used: " + opened.result.error);
  }

  // Of each key the first and the last row of its own order, so that no table is read as a whole.
  StoreResult readDays(SqliteDatabase& database, const StorePlace& place) {
    if (!database.isOpen()) return {};  // new and empty
    for (const std::string table : {"scalars", "distribution_values"}) {
      for (const bool isFirst : {true, false}) {
        std::string query =
            "SELECT coalesce(MOST((SELECT MOST(day) FROM TABLE WHERE key_id = id)), NONE) FROM keys";
        for (const auto& [word, instead] :
             {std::pair<std::string_view, std::string>{"MOST", isFirst ? "min" : "max"},
              {"MOST", isFirst ? "min" : "max"},
              {"TABLE", table},
              {"NONE", std::to_string(kNoDay)}})
          query.replace(query.find(word), word.size(), instead);
        std::int64_t found = 0;
        const int error = database.queryInteger(query, found);
        if (error != 0) return storeFailure(database, place);
        if (found == kNoDay) continue;
        const auto day = static_cast<DayNumber>(found);
        std::optional<DayNumber>& known = isFirst ? found_.store.firstDay : found_.store.lastDay;
        if (!known || (isFirst ? day < *known : day > *known)) known = day;
      }
    }
    return {};
  }

  void examineSpool() {
    auto spool = readSpool(linux_.host(), platform_.propertyListCodec);
    if (spool)
      found_.spool = std::move(*spool);
    else
      need("the log spool cannot be read: " + spool.reason() + "; give it back to the user of the job");
  }

  void foreseeNextRun() {
    const DayNumber day = dayBefore(found_.today);
    std::string& next = found_.nextRun;
    if (found_.lastDay && *found_.lastDay >= day) {
      next = "does nothing before tomorrow: " + dayText(*found_.lastDay) + " was processed";
      return;
    }
    next = "processes " + dayText(day) + " and ";
    if (!found_.consent) {
      next += "writes no report, since submission is off (tallyctl consent on)";
      return;
    }
    if (!found_.whitelist.digest || (!found_.store.isUsable && found_.store.bytes != 0)) {
      next += "writes no report";
      return;
    }
    const auto preview = previewReport(linux_, day);
    if (!preview) {
      next += "writes no report: " + preview.reason();
      return;
    }
    const auto count = [&preview](std::string_view table) {
      const PlistDictionary* entries = preview->get(table).asDictionary();
      return std::to_string(entries != nullptr ? entries->size() : 0);
    };
    next += "writes a report of " + count("TBScalars") + " scalars and " + count("TBDistributions") +
            " distributions (tallyctl report --preview)";
  }

  static constexpr std::int64_t kNoDay = std::int64_t{1} << 40;

  LinuxPlatform& linux_;
  Platform& platform_;
  DeviceStatus found_;
};

std::optional<std::string> dayOrNothing(const std::optional<DayNumber>& day) {
  return day ? std::optional(dayText(*day)) : std::nullopt;
}

}  // namespace

DeviceStatus examineDevice(LinuxPlatform& platform) {
  return Examination(platform).run();
}

void writeStatus(JsonWriter& json, const DeviceStatus& status) {
  const auto texts = [&json](std::string_view key, const std::vector<std::string>& lines) {
    const auto list = json.array(key);
    for (const std::string& line : lines) json.add(line);
  };
  const auto root = json.object();
  json.add("ok", status.isWell());
  json.add("root", status.root);
  json.add("lastDay", dayOrNothing(status.lastDay));
  json.add("consent", status.consent);
  {
    const auto whitelist = json.object("whitelist");
    json.add("digest", status.whitelist.digest);
    texts("problems", status.whitelist.problems);
  }
  {
    const auto store = json.object("store");
    json.add("usable", status.store.isUsable);
    json.add("reason", status.store.reason);
    json.add("bytes", status.store.bytes);
    json.add("firstDay", dayOrNothing(status.store.firstDay));
    json.add("lastDay", dayOrNothing(status.store.lastDay));
  }
  {
    const auto spool = json.object("spool");
    writeSpool(json, status.spool);
  }
  json.add("nextRun", status.nextRun);
  texts("attention", status.attention);
}

}  // namespace tbdaily

#include "tools/tallyctl/metrics/advance.h"

#include "platform/linux/base/host.h"
#include "platform/linux/base/host_notes.h"
#include "platform/linux/base/passing_file.h"
#include "platform/linux/replay/recordings.h"
#include "platform/property_list_codec.h"
#include "tools/tallyctl/metrics/hub_advance.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

void advanceMetrics(Tool& tool, std::uint64_t seconds) {
  PropertyListCodec& codec = tool.platform().services().propertyListCodec;
  Recordings recordings(tool.platform().host(), codec);
  const DeviceFiles& files = tool.platform().host().files();
  const std::filesystem::path place = files.place(Recordings::path(recording::kHub));
  const auto fail = [&](const std::string& reason) { tool.fail(place.native() + ": " + reason); };

  // Of two at once the second moves on what the first has written.
  DeviceFolder folder;
  FileLock lock;
  FileContents contents;
  int error = files.openFolder(recording::kFolder, folder);
  if (error == 0) error = lock.acquire(folder, std::string(recording::kHub) + ".lock");
  if (error == 0) error = files.readFile(Recordings::path(recording::kHub), contents);
  if (error != 0) return fail(errorText(error) + "; there is no recorded hub to move on");
  const PlistParseResult parsed = codec.parse(contents.bytes);
  if (parsed.value.asDictionary() == nullptr)
    return fail(parsed.error.empty() ? "its root is no dictionary" : parsed.error);

  const AdvancedHub hub = advancedHub(parsed.value, recordings.load(recording::kRegistry), seconds);
  const PlistWriteResult written = codec.write(hub.root);
  if (!written.ok) return fail(written.error);
  error = folder.replaceFile(std::string(recording::kHub), written.bytes);
  if (error != 0) return fail(errorText(error));

  if (tool.printedAsJson(
          PlistValue::dictionary({{"channels", PlistValue::int64(static_cast<std::int64_t>(hub.channels))},
                                  {"seconds", PlistValue::int64(static_cast<std::int64_t>(seconds))}})))
    return;
  const auto counted = [](std::uint64_t count, const char* thing) {
    return std::to_string(count) + " " + thing + (count == 1 ? "" : "s");
  };
  tool.out().line("moved " + counted(hub.channels, "channel") + " on by " + counted(seconds, "second"));
}

}  // namespace tbdaily

// tallyctl send: a message to the job's endpoint.

#include <sys/socket.h>

#include <CLI/CLI.hpp>
#include <array>
#include <cerrno>

#include "driver/service_endpoint.h"
#include "platform/analytics_client.h"
#include "platform/byte_writer.h"
#include "platform/linux/base/host_notes.h"
#include "platform/linux/linux_service_listener.h"
#include "platform/linux/unix_socket.h"
#include "tools/tallyctl/app_records.h"
#include "tools/tallyctl/day_argument.h"
#include "tools/tallyctl/input_file.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

namespace {

int sendAll(int socket, std::string_view bytes) {
  while (!bytes.empty()) {
    const ssize_t count = ::send(socket, bytes.data(), bytes.size(), MSG_NOSIGNAL);
    if (count < 0 && errno == EINTR) continue;
    if (count < 0) return errno;
    bytes.remove_prefix(static_cast<std::size_t>(count));
  }
  return 0;
}

// The length in front of a message, little-endian.
std::string lengthPrefix(std::size_t length) {
  std::string prefix;
  appendLittleEndian(prefix, static_cast<std::uint32_t>(length));
  return prefix;
}

void sendMessage(Tool& tool, Operation operation, const PlistDictionary& fields) {
  PlistDictionary message{{"operation", PlistValue::int64(static_cast<std::int64_t>(operation))}};
  for (const auto& [key, value] : fields) message.set(key, value);
  const PlistWriteResult written =
      tool.platform().services().propertyListCodec.write(PlistValue::dictionary(message));
  if (!written.ok) return tool.fail(written.error);
  if (written.bytes.size() > LinuxServiceListener::kMaximumMessageLength)
    return tool.fail("the message is longer than 16 MiB");

  const DeviceFiles& files = tool.platform().host().files();
  const std::string socketName = endpointSocketName(kEndpointName);
  const std::filesystem::path endpoint = files.place(kEndpointFolder) / socketName;
  DeviceFolder folder;
  SocketResult connected;
  connected.error = files.openFolder(kEndpointFolder, folder);
  if (connected.error == 0) connected = connectUnixSocket(folder, socketName);
  if (connected.error == ENOENT || connected.error == ECONNREFUSED) {
    return tool.fail("no job is listening at " + endpoint.native() +
                     "; start tbdaily without arguments first");
  }
  int error = connected.error;
  if (error == 0) error = sendAll(connected.socket.get(), lengthPrefix(written.bytes.size()) + written.bytes);
  if (error != 0) return tool.fail(endpoint.native() + ": " + errorText(error));
  if (!tool.printedAsJson(PlistValue::dictionary({{"sent", PlistValue::dictionary(std::move(message))}}))) {
    tool.out().line("sent to " + endpoint.native());
  }
}

void sendAppInfo(Tool& tool, const std::string& path) {
  const auto given = readPlistOrJsonFile(tool.platform().services().propertyListCodec, path);
  if (!given) return tool.fail(given.reason());
  const auto records = appRecordsForMessage(*given);
  if (!records) return tool.fail(path + ": " + records.reason());
  sendMessage(tool, Operation::ActivatedAppInfo, {{"app_data", *records}});
}

}  // namespace

void addSendCommand(CLI::App& app, Tool& tool) {
  CLI::App* command = app.add_subcommand("send", "Send a message to a listening job");
  command->require_subcommand(1);
  command->add_subcommand("logging-status", "Tell the job that logging was asked for (operation 0)")
      ->callback([&tool] { sendMessage(tool, Operation::LoggingStatus, {}); });

  auto day = std::make_shared<std::string>();
  CLI::App* run = command->add_subcommand("run", "Run the daily tasks for a day (operation 1)");
  run->add_option("DAY", *day, kDayArgumentHelp)->required();
  run->callback([&tool, day] {
    if (const auto number = tool.dayOf(*day))
      sendMessage(tool, Operation::RunForDay, {{"value", PlistValue::int64(*number)}});
  });

  auto file = std::make_shared<std::string>();
  CLI::App* appInfo = command->add_subcommand("app-info", "Send the activated-app info (operation 2)");
  appInfo->add_option("FILE", *file, "Property list or JSON: an array of app records; - is standard input")
      ->required();
  appInfo->callback([&tool, file] { sendAppInfo(tool, *file); });
}

}  // namespace tbdaily

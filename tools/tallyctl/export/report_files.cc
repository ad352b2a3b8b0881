#include "tools/tallyctl/export/report_files.h"

#include <malloc.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <filesystem>

#include "platform/hexadecimal.h"
#include "platform/linux/base/host_notes.h"
#include "platform/linux/log_spool.h"
#include "platform/message_digest.h"
#include "platform/property_list_codec.h"
#include "tools/tallyctl/input_file.h"
#include "tools/tallyctl/report/kept_reports.h"

namespace tbdaily {

namespace {

constexpr std::string_view kDescriptionSuffix = ".meta.plist";
constexpr std::size_t kLargestDescription = std::size_t{1} << 20;
constexpr std::size_t kLongestName = std::size_t{64} << 10;  // far more than the system takes

std::string currentFolder() {
  std::error_code error;
  return std::filesystem::current_path(error).native();
}

// The digest as the text of a UUID, no bit of it changed.
std::string idOfDigest(const Md5Digest& digest) {
  constexpr std::size_t kGroups[] = {4, 2, 2, 2, 6};
  std::string text;
  std::span<const std::byte> rest(digest);
  for (const std::size_t length : kGroups) {
    if (!text.empty()) text += '-';
    appendHexadecimal(text, rest.first(length));
    rest = rest.subspan(length);
  }
  return text;
}

// Reads lines of a limited length, in pieces.
class LineReader {
 public:
  explicit LineReader(int file) : stream_(::fdopen(file, "r")) {}
  ~LineReader() {
    if (stream_ != nullptr) std::fclose(stream_);
  }
  LineReader(const LineReader&) = delete;
  LineReader& operator=(const LineReader&) = delete;

  // The next line without its end; what is longer than the limit is cut off, with one byte too many. Nothing
  // at the end.
  std::optional<std::string> next(std::size_t limit) {
    std::string line;
    int c = EOF;
    while (stream_ != nullptr && (c = ::getc_unlocked(stream_)) != EOF && c != '\n') {
      if (line.size() <= limit) line += static_cast<char>(c);
    }
    if (c == EOF && line.empty()) return std::nullopt;
    return line;
  }
  bool hasFailed() const { return stream_ == nullptr || std::ferror(stream_) != 0; }

 private:
  std::FILE* stream_;
};

}  // namespace

std::string deviceOfPath(std::string_view path, std::string_view folder) {
  const std::string place = (std::filesystem::path(folder) / path).lexically_normal().native();
  const std::size_t logs = place.rfind(std::string(LogSpool::kFolder) + "/");
  if (logs == std::string::npos) return {};
  const std::string root = place.substr(0, logs);
  return root.substr(root.rfind('/') + 1);
}

ReportFiles::ReportFiles(LinuxPlatform& platform, std::optional<std::string> device)
    : platform_(platform), device_(std::move(device)), folder_(currentFolder()) {
  // What one report took the next one takes: the kernel is not asked for it anew.
  ::mallopt(M_MMAP_THRESHOLD, 32 << 20);
  ::mallopt(M_TRIM_THRESHOLD, 64 << 20);
}

Outcome<ReportFile> ReportFiles::parsed(std::span<const std::byte> bytes, const std::string& name,
                                        std::optional<std::string> id) {
  bytes_ += bytes.size();
  const Platform& services = platform_.services();
  PlistParseResult result = services.propertyListCodec.parse(bytes);
  if (!result.error.empty()) return Failure{name + ": " + result.error};
  ReportFile file{name, std::move(result.value), {}, {}};
  file.origin.id = id ? std::move(*id) : idOfDigest(services.messageDigest.md5(bytes));
  file.origin.device = device_.value_or("");
  return file;
}

Outcome<ReportFile> ReportFiles::read(const std::string& path, const std::string& name, const Read& read) {
  if (const int error = read(path, contents_, kLargestPlistInput); error != 0)
    return inputFailure(name, error, kLargestPlistInput);
  std::string fault;
  std::optional<std::string> id;
  const int error = read(path + std::string(kDescriptionSuffix), description_, kLargestDescription);
  if (error == 0) {
    const PlistParseResult result = platform_.services().propertyListCodec.parse(description_.bytes);
    fault = result.error;
    const PlistValue found = result.value.get("id");
    if (const auto text = found.asString(); text && !text->empty()) id = std::string(*text);
  } else if (error != ENOENT && error != ENAMETOOLONG) {
    fault = errorText(error);
  }
  auto file = parsed(contents_.bytes, name, std::move(id));
  if (file && !fault.empty()) file->descriptionFault = name + std::string(kDescriptionSuffix) + ": " + fault;
  return file;
}

Outcome<ReportFile> ReportFiles::readFromHost(const std::string& path) {
  auto file = read(path, path, [](const std::string& place, FileContents& contents, std::size_t maximum) {
    return readHostFile(place, contents, maximum);
  });
  if (file && !device_) file->origin.device = deviceOfPath(path, folder_);
  return file;
}

Outcome<ReportFile> ReportFiles::readStandardInput() {
  const auto bytes = readInput("-", kLargestPlistInput);
  if (!bytes) return Failure{bytes.reason()};
  return parsed(*bytes, "standard input", std::nullopt);
}

void ReportFiles::visit(std::span<const std::string> paths, const ReportVisitor& visitor) {
  for (const std::string& path : paths) {
    if (!visitor(path == "-" ? readStandardInput() : readFromHost(path), bytes_)) return;
  }
}

Outcome<Nothing> ReportFiles::visitListed(const std::string& list, const ReportVisitor& visitor) {
  const std::string name = list == "-" ? "standard input" : list;
  FileDescriptor file(list == "-" ? ::dup(STDIN_FILENO) : -1);
  const int error = list != "-" ? openHostFile(list, file) : file.isOpen() ? 0 : errno;
  if (error != 0) return Failure{name + ": " + errorText(error)};
  LineReader lines(file.get());
  file.release();
  while (const auto line = lines.next(kLongestName)) {
    if (line->empty()) continue;
    const bool isName = line->size() <= kLongestName && line->find('\0') == std::string::npos;
    if (!visitor(isName ? readFromHost(*line) : Failure{name + ": a line of it is no name of a file"},
                 bytes_))
      return Nothing{};
  }
  if (lines.hasFailed()) return Failure{name + ": " + errorText(errno)};
  return Nothing{};
}

Outcome<Nothing> ReportFiles::visitKept(const ReportVisitor& visitor) {
  const DeviceFiles& files = platform_.host().files();
  const auto reports = keptReports(files, ReportFolders::Leaving);
  if (!reports) return Failure{reports.reason()};
  const std::string logs = std::string(LogSpool::kFolder) + "/";
  const std::string device = deviceOfPath(files.root().native() + logs, folder_);
  for (const KeptReport& report : *reports) {
    auto file = read(report.path, files.place(report.path).native(),
                     [&files](const std::string& path, FileContents& contents, std::size_t maximum) {
                       return files.readFile(path, contents, maximum);
                     });
    if (file && !device_) file->origin.device = device;
    if (!visitor(file, bytes_)) break;
  }
  return Nothing{};
}

}  // namespace tbdaily

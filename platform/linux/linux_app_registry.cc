#include "platform/linux/linux_app_registry.h"

#include <algorithm>
#include <array>

namespace tbdaily {

namespace fs = std::filesystem;

namespace {

struct ApplicationFolder {
  std::string_view path;
  std::string_view bundleType;
};

constexpr std::array<ApplicationFolder, 3> kSharedFolders = {{
    {"/usr/share/applications", "System"},
    {"/usr/local/share/applications", "User"},
    {"/var/lib/flatpak/exports/share/applications", "User"},
}};
constexpr std::string_view kHomes = "/home";
constexpr std::string_view kFolderInHome = ".local/share/applications";

std::string_view trimmed(std::string_view text) {
  const std::size_t first = text.find_first_not_of(" \t\r");
  if (first == std::string_view::npos) return {};
  return text.substr(first, text.find_last_not_of(" \t\r") - first + 1);
}

// An entry of type Application that its owner did not mark as deleted. NoDisplay is no reason: such a program
// is installed.
bool isVisibleApplication(const fs::path& desktopEntry) {
  constexpr std::size_t kMaximumSize = std::size_t{1} << 20;  // anybody with a home may put files there
  FileContents contents;
  if (readHostFile(desktopEntry, contents, kMaximumSize) != 0) return false;
  std::string_view rest = contents.text();
  bool inEntry = false, isApplication = false;
  while (!rest.empty()) {
    const std::string_view text = trimmed(takeLine(rest));
    if (text.starts_with('[')) {
      if (inEntry) break;
      inEntry = text == "[Desktop Entry]";
      continue;
    }
    const std::size_t equals = text.find('=');
    if (!inEntry || equals == std::string_view::npos) continue;
    const std::string_view key = trimmed(text.substr(0, equals));
    const std::string_view value = trimmed(text.substr(equals + 1));
    if (key == "Type") isApplication = value == "Application";
    if (key == "Hidden" && value == "true") return false;
  }
  return isApplication;
}

void addApplications(const fs::path& folder, std::string_view type,
                     std::vector<LiveApplication>& applications) {
  std::error_code error;
  fs::recursive_directory_iterator entries(folder, fs::directory_options::skip_permission_denied, error);
  for (; !error && entries != fs::recursive_directory_iterator(); entries.increment(error)) {
    std::error_code ignored;
    if (entries->path().extension() != ".desktop" || !entries->is_regular_file(ignored)) continue;
    if (isVisibleApplication(entries->path()))
      applications.push_back({entries->path().stem().native(), type});
  }
}

}  // namespace

void LinuxAppRegistry::enumerateBundles(BundleKind kind,
                                        const std::function<void(std::string_view)>& bundle) {
  if (kind != BundleKind::Application) return;
  const PlistValue recorded = recordings_.entry(recording::kApps, "bundles");
  if (const PlistArray* bundles = recorded.asArray()) {
    for (const PlistValue& entry : *bundles) {
      if (entry.asDictionary() == nullptr) continue;
      const PlistValue type = entry.get("type");
      bundle(type.asString().value_or(std::string_view()));
    }
    return;
  }
  if (!host_.live()) return;
  for (const LiveApplication& application : liveApplications(host_)) bundle(application.type);
}

std::vector<LiveApplication> liveApplications(const Host& host) {
  std::vector<LiveApplication> applications;
  for (const ApplicationFolder& folder : kSharedFolders)
    addApplications(host.livePath(folder.path), folder.bundleType, applications);
  std::error_code error;
  fs::directory_iterator homes(host.livePath(kHomes), error);
  for (; !error && homes != fs::directory_iterator(); homes.increment(error))
    addApplications(homes->path() / kFolderInHome, "User", applications);
  return applications;
}

}  // namespace tbdaily

// The one way in which the host layer tells an administrator about trouble: lines on standard error.
#pragma once

#include <filesystem>
#include <string>

namespace tbdaily {

// One line, prefixed by the program's name. The same line is written once in the life of a process, and no
// more than a thousand altogether.
void noteOnce(const std::string& line);
// For a file or folder that could not be written: one line for each kind of failure in the life of a process,
// since a root that cannot be written fails every write in the same way.
void noteWriteFailure(const std::filesystem::path& path, int error);
// The same for a device root that cannot be used at all.
void noteUnusableRoot(const std::filesystem::path& root, int error);

// "permission denied" and the like, for an errno value or a FileRefusal.
std::string errorText(int error);

}  // namespace tbdaily

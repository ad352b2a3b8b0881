// A private copy of the analytics store, for whoever must not touch the device root: even a reader of a
// write-ahead log leaves traces beside it.
#pragma once

#include <filesystem>
#include <string>

namespace tbdaily {

class StoreCopy {
 public:
  // Copies the store and its write-ahead log into a folder of its own, which the destructor removes. A store
  // that is missing gives a copy that is missing.
  explicit StoreCopy(const std::filesystem::path& store);
  ~StoreCopy();
  StoreCopy(const StoreCopy&) = delete;
  StoreCopy& operator=(const StoreCopy&) = delete;

  const std::string& error() const { return error_; }  // empty on success
  const std::filesystem::path& path() const { return path_; }

 private:
  std::filesystem::path folder_;
  std::filesystem::path path_;
  std::string error_;
};

}  // namespace tbdaily

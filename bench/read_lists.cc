// Reads the property lists that a file names, a line each, and nothing more: beside it an export is measured.
// Prints how many entries their scalar tables have.

#include <cstdio>
#include <fstream>
#include <iostream>
#include <string>

#include "platform/linux/base/file_io.h"
#include "platform/plist/codec.h"

int main(int argc, char** argv) {
  std::ifstream names(argc == 2 ? argv[1] : "");
  std::size_t entries = 0;
  tbdaily::PlistCodec codec;
  for (std::string name; std::getline(names, name);) {
    tbdaily::FileContents contents;
    if (tbdaily::readHostFile(name, contents) != 0) return 1;
    const tbdaily::PlistValue scalars = codec.parse(contents.bytes).value.get("TBScalars");
    if (scalars.asDictionary() == nullptr) return 1;
    entries += scalars.asDictionary()->size();
  }
  std::cout << entries << '\n';
  return 0;
}

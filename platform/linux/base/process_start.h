// What a program does before anything else.
#pragma once

#include <sys/types.h>

namespace tbdaily {

// Opens standard input, output and error on /dev/null where they are closed, so that no file of the device
// gets their numbers; and takes from the umask what would keep the process from its own files: folders and
// files get the modes that they are made with. And keeps freed memory a while for the next use.
void prepareProcess();

// The umask that the program was started with, for what it makes for its user.
mode_t umaskAtStart();

}  // namespace tbdaily

// The process entry: from the command line to a mode.
#pragma once

#include "platform/platform.h"

namespace tbdaily {

// Without arguments serves the endpoint until 10 quiet seconds have passed; with "-d", "-f" or "-t" runs the
// daily tasks once. Answers the exit status, which is always 0.
int runEntry(Platform& platform, int argumentCount, const char* const* arguments);

}  // namespace tbdaily

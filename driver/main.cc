#include <csignal>
#include <exception>
#include <string>

#include "driver/entry.h"
#include "platform/linux/base/host_notes.h"
#include "platform/linux/base/process_start.h"
#include "platform/linux/linux_platform.h"

int main(int argc, char** argv) {
  tbdaily::prepareProcess();
  // A reader of our output that went away, or a limit on the size of files, is an error like others and no
  // reason to die.
  std::signal(SIGPIPE, SIG_IGN);
  std::signal(SIGXFSZ, SIG_IGN);
  try {
    tbdaily::LinuxPlatform platform(tbdaily::Host::fromEnvironment());
    return tbdaily::runEntry(platform.services(), argc, argv);
  } catch (const std::exception& failure) {
    tbdaily::noteOnce(std::string("the run ended early: ") + failure.what());
  }
  return 0;
}

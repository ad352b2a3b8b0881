#include <csignal>
#include <exception>
#include <string>

#include "driver/entry.h"
#include "platform/linux/linux_platform.h"

int main(int argc, char** argv) {
  std::signal(SIGPIPE, SIG_IGN);  // a reader of our output that went away is no reason to die
  try {
    tbdaily::LinuxPlatform platform(tbdaily::Host::fromEnvironment());
    return tbdaily::runEntry(platform.services(), argc, argv);
  } catch (const std::exception& failure) {
    tbdaily::Host::noteOnce(std::string("the run ended early: ") + failure.what());
  }
  return 0;
}

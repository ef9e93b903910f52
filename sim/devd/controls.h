// The test controls: one JSON command in, one JSON answer out. The commands and their members are
// listed in README.md; every answer has "ok", and "error" with the reason when ok is false.
#pragma once

#include "daemon.h"

#include <string>

namespace devd {

// Carries out one command line and returns the answer (compact JSON, without a line end).
std::string runControl(Daemon& daemon, const std::string& commandLine);

}  // namespace devd

// Starting a stand-in program as a child process and ending it, and the temporary folder it works
// in, for the test harnesses that drive one (TimeServiceSim, DeviceDaemon).
//
// The child is sent SIGTERM when the thread that started it ends, so a crashed test leaves no
// program behind: start it from a thread that outlives it.
#pragma once

#include <sys/types.h>

#include <chrono>
#include <string>
#include <vector>

namespace tiktaltest {

struct StartedChild {
    pid_t pid = -1;
    std::string ready;    // the rest of the child's first line after the expected prefix
    std::string problem;  // empty when the child printed the expected line in time
};

// Starts `arguments` (the program first) and reads its standard output up to the first line end,
// for at most `limit`; the line must start with `readyPrefix`. On a problem (fork failed, the
// child ended, said nothing in time or something else) the child, if any, may still be running:
// end it with stopChild.
StartedChild startChild(std::vector<std::string> arguments, const std::string& readyPrefix,
                        std::chrono::milliseconds limit);

// Sends `signal` and waits up to `limit` for the child to end, then kills it if it has not.
// Returns its exit status, or 128 + the signal that ended it.
int stopChild(pid_t pid, int signal, std::chrono::milliseconds limit);

// A new folder /tmp/NAME.XXXXXX; throws std::runtime_error when it cannot be made.
std::string makeTemporaryFolder(const std::string& name);
// Removes a folder and everything in it; does nothing for an empty path.
void removeFolder(const std::string& path) noexcept;

}  // namespace tiktaltest

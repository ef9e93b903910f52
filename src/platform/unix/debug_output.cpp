// The debug output (standard error) and the fatal end of the process.
#include "platform/platform.h"
#include "platform/unix/unix.h"

#include <unistd.h>

#include <cerrno>

namespace platform {

// One write(2) per line: the kernel does not split a pipe write of up to PIPE_BUF bytes, and
// trace lines are shorter than that.
void writeDebugOutput(const char* line, std::size_t length) noexcept {
    while (length > 0) {
        const ssize_t written = ::write(STDERR_FILENO, line, length);
        if (written < 0 && errno == EINTR) continue;
        if (written <= 0) return;
        line += written;
        length -= static_cast<std::size_t>(written);
    }
}

void fatalError(const std::string& text) noexcept {
    const std::string line = "Fatal Error: " + text + "\n";
    writeDebugOutput(line.data(), line.size());
    ::_exit(1);
}

}  // namespace platform

// One connection of the control socket: a JSON command per line, each answered by one line.
#include "controls.h"
#include "daemon.h"

#include <sys/socket.h>

#include <cerrno>

namespace devd {
namespace {

// A command line longer than this is refused and ends the connection.
constexpr std::size_t kLineLimit = 65536;

bool sendLine(int fd, std::string line) {
    line += '\n';
    for (std::size_t sent = 0; sent < line.size();) {
        const ssize_t wrote = ::send(fd, line.data() + sent, line.size() - sent, MSG_NOSIGNAL);
        if (wrote < 0 && errno == EINTR) continue;
        if (wrote <= 0) return false;
        sent += static_cast<std::size_t>(wrote);
    }
    return true;
}

}  // namespace

void serveControl(Daemon& daemon, int fd) {
    std::string pending;
    char buffer[4096];
    for (;;) {
        const std::size_t end = pending.find('\n');
        if (end != std::string::npos) {
            const std::string line = pending.substr(0, end);
            pending.erase(0, end + 1);
            if (!sendLine(fd, runControl(daemon, line))) break;
            continue;
        }
        if (pending.size() > kLineLimit) {
            sendLine(fd, R"({"ok":false,"error":"command line too long"})");
            break;
        }
        const ssize_t got = recv(fd, buffer, sizeof buffer, 0);
        if (got < 0 && errno == EINTR) continue;
        if (got <= 0) break;
        pending.append(buffer, static_cast<std::size_t>(got));
    }
}

}  // namespace devd

#include "connections.h"

#include <arpa/inet.h>
#include <dirent.h>
#include <sys/socket.h>

#include <cstdlib>
#include <limits>

namespace timeservice {
namespace {

// The epoch in which the connection of this thread was last marked; every connection has a thread
// of its own, so a thread's value belongs to its one connection.
constexpr unsigned kUnmarked = std::numeric_limits<unsigned>::max();
thread_local unsigned tMarkedEpoch = kUnmarked;

int localPort(const sockaddr_storage& address) {
    if (address.ss_family == AF_INET) return ntohs(reinterpret_cast<const sockaddr_in&>(address).sin_port);
    if (address.ss_family == AF_INET6) return ntohs(reinterpret_cast<const sockaddr_in6&>(address).sin6_port);
    return -1;
}

// A connected TCP socket whose local port is `port`: one the server accepted.
bool acceptedOn(int fd, int port) {
    sockaddr_storage local{}, peer{};
    socklen_t localSize = sizeof local, peerSize = sizeof peer;
    return getsockname(fd, reinterpret_cast<sockaddr*>(&local), &localSize) == 0 && localPort(local) == port &&
           getpeername(fd, reinterpret_cast<sockaddr*>(&peer), &peerSize) == 0;
}

}  // namespace

void ConnectionThreads::enqueue(std::function<void()> serveConnection) {
    std::lock_guard<std::mutex> lock(_mutex);
    joinFinished();
    Worker& worker = _workers.emplace_back();
    worker.thread = std::thread([&worker, serve = std::move(serveConnection)] {
        serve();
        worker.done = true;
    });
}

void ConnectionThreads::shutdown() {
    std::lock_guard<std::mutex> lock(_mutex);
    for (Worker& worker : _workers) worker.thread.join();
    _workers.clear();
}

void ConnectionThreads::joinFinished() {
    _workers.remove_if([](Worker& worker) {
        if (!worker.done) return false;
        worker.thread.join();
        return true;
    });
}

bool firstCallOnConnection(unsigned epoch) {
    if (tMarkedEpoch == epoch) return false;
    tMarkedEpoch = epoch;
    return true;
}

void shutReceivingSides(int port) {
    DIR* folder = opendir("/proc/self/fd");
    if (!folder) return;
    while (const dirent* entry = readdir(folder)) {
        const int fd = std::atoi(entry->d_name);
        if (fd != dirfd(folder) && entry->d_name[0] != '.' && acceptedOn(fd, port)) ::shutdown(fd, SHUT_RD);
    }
    closedir(folder);
}

}  // namespace timeservice

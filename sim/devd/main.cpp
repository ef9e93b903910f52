// tiktal_devd: a stand-in for the timing module's kernel driver, for tests and the demo.
//
//   tiktal_devd --socket PATH [--control PATH]
//
// Listens on PATH, the module's device interface path, for the driver's request packets (a Unix
// seqpacket socket, one message per request and per answer), and on the control path (default
// PATH + ".control", a Unix stream socket) for test controls. Once it accepts connections on both
// it prints the one line "listening on PATH". SIGTERM or SIGINT stop it: the sockets are removed,
// every connection ends, and it exits with status 0. README.md describes the rest.
#include "connections.h"
#include "daemon.h"
#include "stop_signals.h"

#include <poll.h>
#include <signal.h>
#include <sys/signalfd.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstring>
#include <map>
#include <string>
#include <thread>

namespace {

struct Arguments {
    std::string socket;
    std::string control;
};

// Reads the options, each at most once; false after printing the usage.
bool readArguments(int argc, char** argv, Arguments& arguments) {
    const std::map<std::string, std::string*> options = {{"--socket", &arguments.socket},
                                                         {"--control", &arguments.control}};
    bool usable = argc % 2 == 1;
    for (int i = 1; usable && i < argc; i += 2) {
        const auto option = options.find(argv[i]);
        usable = option != options.end() && option->second->empty() && argv[i + 1][0] != '\0';
        if (usable) *option->second = argv[i + 1];
    }
    if (!usable || arguments.socket.empty()) {
        std::fprintf(stderr, "usage: tiktal_devd --socket PATH [--control PATH]\n");
        return false;
    }
    if (arguments.control.empty()) arguments.control = arguments.socket + ".control";
    return true;
}

// A listening Unix socket of `type` at `path`; -1 after saying why on standard error. A socket
// left at the path by an earlier run that did not stop cleanly is replaced; any other file is not.
int listenOn(const std::string& path, int type) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    if (path.size() >= sizeof address.sun_path) {
        std::fprintf(stderr, "tiktal_devd: %s: the path is longer than a socket path may be\n", path.c_str());
        return -1;
    }
    std::memcpy(address.sun_path, path.c_str(), path.size() + 1);
    struct stat existing {};
    if (lstat(path.c_str(), &existing) == 0 && S_ISSOCK(existing.st_mode)) unlink(path.c_str());
    const int fd = socket(AF_UNIX, type | SOCK_CLOEXEC, 0);
    if (fd >= 0 && bind(fd, reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0 && listen(fd, 64) == 0)
        return fd;
    std::fprintf(stderr, "tiktal_devd: cannot listen on %s: %s\n", path.c_str(), std::strerror(errno));
    if (fd >= 0) close(fd);
    return -1;
}

// Accepts connections on both sockets until a stop signal arrives.
void acceptUntilStopped(devd::Daemon& daemon, devd::Connections& connections, int stopFd, int deviceFd, int controlFd) {
    for (;;) {
        pollfd watched[] = {{stopFd, POLLIN, 0}, {deviceFd, POLLIN, 0}, {controlFd, POLLIN, 0}};
        if (poll(watched, 3, -1) < 0) {
            if (errno == EINTR) continue;
            return;
        }
        if (watched[0].revents != 0) return;
        for (int i = 1; i < 3; ++i) {
            if (watched[i].revents == 0) continue;
            const int fd = accept4(watched[i].fd, nullptr, nullptr, SOCK_CLOEXEC);
            if (fd < 0 && (errno == EMFILE || errno == ENFILE))  // out of descriptors: let connections end
                std::this_thread::sleep_for(std::chrono::milliseconds(10));
            if (fd < 0) continue;  // or the peer gave up already
            if (i == 1)
                connections.start(fd, [&daemon](int connection) { devd::serveDevice(daemon, connection); });
            else
                connections.start(fd, [&daemon](int connection) { devd::serveControl(daemon, connection); });
        }
    }
}

}  // namespace

int main(int argc, char** argv) {
    Arguments arguments;
    if (!readArguments(argc, argv, arguments)) return 2;
    // The stop signals arrive on this descriptor only: every thread has them blocked.
    const sigset_t signals = simcommon::blockStopSignals();
    const int stopFd = signalfd(-1, &signals, SFD_CLOEXEC);
    if (stopFd < 0) {
        std::fprintf(stderr, "tiktal_devd: signalfd: %s\n", std::strerror(errno));
        return 1;
    }
    const int deviceFd = listenOn(arguments.socket, SOCK_SEQPACKET);
    const int controlFd = deviceFd < 0 ? -1 : listenOn(arguments.control, SOCK_STREAM);
    if (controlFd < 0) {
        if (deviceFd >= 0) unlink(arguments.socket.c_str());
        return 1;
    }

    devd::Daemon daemon;
    devd::Connections connections;
    std::printf("listening on %s\n", arguments.socket.c_str());
    std::fflush(stdout);
    acceptUntilStopped(daemon, connections, stopFd, deviceFd, controlFd);

    daemon.lifetime.stop();  // delays end at once
    close(deviceFd);
    close(controlFd);
    unlink(arguments.socket.c_str());
    unlink(arguments.control.c_str());
    connections.stopAll();
    close(stopFd);
    return 0;
}

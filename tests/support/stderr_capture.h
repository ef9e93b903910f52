// Capture of standard error for tests: whole writes to fd 2, or none at all.
#pragma once

#include <fcntl.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <climits>
#include <cerrno>
#include <optional>
#include <string>
#include <system_error>
#include <thread>
#include <vector>

namespace testsupport {

// The longest write that reaches a reader of a shared pipe whole.
inline constexpr std::size_t kWholeWriteLimit = PIPE_BUF;

// Points fd 2 at `fd` until restore() or destruction.
class Fd2Redirect {
public:
    explicit Fd2Redirect(int fd) : _saved(::dup(STDERR_FILENO)) {
        if (_saved < 0 || ::dup2(fd, STDERR_FILENO) < 0) throw std::system_error(errno, std::generic_category(), "dup");
    }
    ~Fd2Redirect() { restore(); }
    Fd2Redirect(const Fd2Redirect&) = delete;
    Fd2Redirect& operator=(const Fd2Redirect&) = delete;

    void restore() {
        if (_saved < 0) return;
        ::dup2(_saved, STDERR_FILENO);
        ::close(_saved);
        _saved = -1;
    }

private:
    int _saved;
};

// Sends fd 2 to /dev/null while alive.
class QuietStderr {
public:
    QuietStderr() : _null(::open("/dev/null", O_WRONLY | O_CLOEXEC)), _redirect(_null) {}
    ~QuietStderr() {
        _redirect.restore();
        ::close(_null);
    }

private:
    int _null;
    Fd2Redirect _redirect;
};

// Collects what is written to fd 2, one string per write(2): fd 2 is a SOCK_SEQPACKET socket
// while it is alive, so every write arrives as one message.
class StderrCapture {
public:
    StderrCapture() {
        int ends[2];
        if (::socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, ends) != 0)
            throw std::system_error(errno, std::generic_category(), "socketpair");
        _reader = ends[0];
        _redirect.emplace(ends[1]);
        ::close(ends[1]);
        _thread = std::thread([this] {
            std::vector<char> buffer(1 << 16);
            for (;;) {
                const ssize_t n = ::recv(_reader, buffer.data(), buffer.size(), MSG_TRUNC);
                if (n < 0 && errno == EINTR) continue;
                if (n <= 0) return;  // the last writing end is closed
                _writes.emplace_back(buffer.data(), std::min(static_cast<std::size_t>(n), buffer.size()));
            }
        });
    }
    ~StderrCapture() { finish(); }

    // Restores fd 2 and returns the writes made since the capture began.
    std::vector<std::string> finish() {
        _redirect.reset();
        if (_thread.joinable()) _thread.join();
        if (_reader >= 0) ::close(_reader);
        _reader = -1;
        return std::move(_writes);
    }

private:
    int _reader = -1;
    std::optional<Fd2Redirect> _redirect;
    std::vector<std::string> _writes;
    std::thread _thread;
};

}  // namespace testsupport

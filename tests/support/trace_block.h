// Holds a thread inside the library while it writes its trace: fd 2 becomes a pipe of one page
// that is filled so that only the first trace line of a call fits, and the thread then blocks in
// write(2) on its second line, inside the session operation, until the pipe is read.
#pragma once

#include <fcntl.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <future>
#include <optional>
#include <stdexcept>
#include <string>
#include <system_error>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "stderr_capture.h"

namespace testsupport {

// Polls `done` until it holds; false after 10 s, so that a fault fails the test instead of hanging it.
template <class Done>
bool waitUntil(Done&& done) {
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(10);
    while (!done()) {
        if (std::chrono::steady_clock::now() > deadline) return false;
        std::this_thread::yield();
    }
    return true;
}

// Runs `blocked` on a thread of its own with fd 2 a pipe of one page that has room for its first
// trace line only (`firstLineSize` bytes). Once that line is in the pipe, the thread is inside the
// library, blocked writing its next line; then `meanwhile` runs (on another thread, given up after
// 10 s) and afterwards the pipe is read so that `blocked` can finish. Returns the trace lines
// that `blocked` and `meanwhile` wrote.
template <class Blocked, class Meanwhile>
std::vector<std::string> whileBlockedInTrace(std::size_t firstLineSize, Blocked&& blocked, Meanwhile&& meanwhile) {
    using namespace std::chrono_literals;
    int ends[2];
    if (::pipe2(ends, O_CLOEXEC) != 0) throw std::system_error(errno, std::generic_category(), "pipe2");
    const int capacity = ::fcntl(ends[1], F_SETPIPE_SZ, 4096);  // rounded up to one page
    if (capacity <= static_cast<int>(firstLineSize)) throw std::runtime_error("cannot make a pipe of one page");
    const std::string filler(static_cast<std::size_t>(capacity) - firstLineSize, '#');
    EXPECT_EQ(::write(ends[1], filler.data(), filler.size()), static_cast<ssize_t>(filler.size()));
    std::optional<Fd2Redirect> redirect(std::in_place, ends[1]);
    ::close(ends[1]);  // fd 2 is now the only writing end

    std::thread thread(blocked);
    std::future<void> other;
    const auto full = [&] {
        int buffered = 0;
        return ::ioctl(ends[0], FIONREAD, &buffered) == 0 && buffered == capacity;
    };
    if (!waitUntil(full)) {
        ADD_FAILURE() << "the first trace line never arrived";
    } else {
        other = std::async(std::launch::async, meanwhile);
        if (other.wait_for(10s) != std::future_status::ready)
            ADD_FAILURE() << "the calls made meanwhile waited for the blocked thread";
    }
    std::string output;
    std::thread reader([&] {
        char buffer[4096];
        for (ssize_t n; (n = ::read(ends[0], buffer, sizeof buffer)) != 0;)
            if (n > 0) output.append(buffer, static_cast<std::size_t>(n));
            else if (errno != EINTR) return;
    });
    thread.join();
    if (other.valid()) other.get();
    redirect.reset();  // end of file for the reader
    reader.join();
    ::close(ends[0]);

    std::vector<std::string> lines;
    for (std::size_t at = filler.size(), end; at < output.size(); at = end) {
        end = std::min(output.find('\n', at), output.size() - 1) + 1;
        lines.push_back(output.substr(at, end - at));
    }
    return lines;
}

}  // namespace testsupport

// Child processes that run a piece of the test itself (forked, so they share its code and its
// machine), for tests of several processes on one configuration file.
#pragma once

#include <signal.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <exception>
#include <functional>

namespace configtest {

// Runs `work` in a child process; its exit status is 0 when it returned, 1 when it raised. The
// child is killed when the test process ends, however it ends.
inline pid_t startProcess(const std::function<void()>& work) {
    const pid_t parent = ::getpid();
    const pid_t pid = ::fork();
    if (pid != 0) return pid;
    ::prctl(PR_SET_PDEATHSIG, SIGKILL);
    if (::getppid() != parent) ::_exit(3);  // the parent ended before the line above
    int status = 0;
    try {
        work();
    } catch (const std::exception& failure) {
        std::fprintf(stderr, "child %d: %s\n", static_cast<int>(::getpid()), failure.what());
        status = 1;
    }
    ::_exit(status);  // no test framework teardown in the child
}

// Kills a child that runs until it is killed, also when a failed assertion ends the test early.
struct KilledAtEnd {
    explicit KilledAtEnd(pid_t child) noexcept : pid(child) {}
    KilledAtEnd(KilledAtEnd&& other) noexcept : pid(other.pid) { other.pid = -1; }
    KilledAtEnd(const KilledAtEnd&) = delete;
    KilledAtEnd& operator=(const KilledAtEnd&) = delete;

    pid_t pid;
    ~KilledAtEnd() {
        if (pid > 0) {
            ::kill(pid, SIGKILL);
            ::waitpid(pid, nullptr, 0);
        }
    }
};

inline int exitStatusOf(pid_t pid) {
    int status = 0;
    while (::waitpid(pid, &status, 0) < 0 && errno == EINTR) {
    }
    return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

}  // namespace configtest

#include "child_process.h"

#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <stdexcept>
#include <thread>

namespace tiktaltest {
namespace {

using Clock = std::chrono::steady_clock;

std::string errnoText(const char* call) { return std::string(call) + ": " + std::strerror(errno); }

// Waits up to `limit` for the child to end; -1 when it has not.
int waitForExit(pid_t pid, Clock::duration limit) {
    const auto deadline = Clock::now() + limit;
    for (;;) {
        int status = 0;
        const pid_t done = waitpid(pid, &status, WNOHANG);
        if (done == pid) return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
        if (done < 0 && errno != EINTR) return 128 + SIGKILL;  // not our child any more
        if (Clock::now() >= deadline) return -1;
        std::this_thread::sleep_for(std::chrono::milliseconds(2));
    }
}

// Reads `fd` up to the first line end, for at most `limit`; `problem` says why it did not get one.
std::string readFirstLine(int fd, std::chrono::milliseconds limit, const std::string& program, std::string& problem) {
    std::string text;
    const auto deadline = Clock::now() + limit;
    while (problem.empty() && text.find('\n') == std::string::npos) {
        const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(deadline - Clock::now()).count();
        pollfd ready{fd, POLLIN, 0};
        const int polled = left > 0 ? poll(&ready, 1, static_cast<int>(left)) : 0;
        if (polled < 0 && errno == EINTR) continue;
        if (polled == 0) problem = "no line on standard output within " + std::to_string(limit.count()) + " ms";
        if (polled < 0) problem = errnoText("poll");
        if (!problem.empty()) break;
        char buffer[256];
        const ssize_t got = read(fd, buffer, sizeof buffer);
        if (got < 0 && errno == EINTR) continue;
        if (got <= 0) problem = program + " ended before it printed a line";
        else text.append(buffer, static_cast<size_t>(got));
    }
    return text.substr(0, text.find('\n'));
}

}  // namespace

StartedChild startChild(std::vector<std::string> arguments, const std::string& readyPrefix,
                        std::chrono::milliseconds limit) {
    StartedChild child;
    // Everything the child needs is prepared before fork: after it, the child only calls exec.
    std::vector<char*> argv;
    for (std::string& argument : arguments) argv.push_back(argument.data());
    argv.push_back(nullptr);
    int output[2];
    if (pipe2(output, O_CLOEXEC) != 0) {
        child.problem = errnoText("pipe2");
        return child;
    }
    const pid_t parent = getpid();
    child.pid = fork();
    if (child.pid == 0) {
        prctl(PR_SET_PDEATHSIG, SIGTERM);
        if (getppid() != parent) _exit(126);
        dup2(output[1], STDOUT_FILENO);
        execv(argv[0], argv.data());
        _exit(127);
    }
    close(output[1]);
    if (child.pid < 0) child.problem = errnoText("fork");
    const std::string line = child.pid < 0 ? "" : readFirstLine(output[0], limit, arguments[0], child.problem);
    close(output[0]);
    if (child.problem.empty() && line.compare(0, readyPrefix.size(), readyPrefix) != 0)
        child.problem = "unexpected output: " + line;
    if (child.problem.empty()) child.ready = line.substr(readyPrefix.size());
    return child;
}

int stopChild(pid_t pid, int signal, std::chrono::milliseconds limit) {
    kill(pid, signal);
    int status = waitForExit(pid, limit);
    if (status < 0) {  // it did not stop: a fault of the program that the caller sees
        kill(pid, SIGKILL);
        status = waitForExit(pid, limit);
    }
    return status;
}

std::string makeTemporaryFolder(const std::string& name) {
    std::string folder = "/tmp/" + name + ".XXXXXX";
    if (!mkdtemp(folder.data())) throw std::runtime_error(errnoText("mkdtemp"));
    return folder;
}

void removeFolder(const std::string& path) noexcept {
    if (path.empty()) return;
    std::error_code ignored;
    std::filesystem::remove_all(path, ignored);
}

}  // namespace tiktaltest

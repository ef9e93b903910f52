#include "timeservice_sim.h"

#include <cjson/cJSON.h>
#include <curl/curl.h>
#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <memory>
#include <mutex>
#include <stdexcept>
#include <thread>
#include <vector>

namespace {

using Clock = std::chrono::steady_clock;
constexpr auto kStartLimit = std::chrono::seconds(10);
constexpr auto kStopLimit = std::chrono::seconds(10);

std::runtime_error failure(const std::string& what) { return std::runtime_error("TimeServiceSim: " + what); }

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

size_t appendBody(char* data, size_t size, size_t count, void* target) {
    static_cast<std::string*>(target)->append(data, size * count);
    return size * count;
}

long long numberMember(const std::string& json, const char* name) {
    std::unique_ptr<cJSON, decltype(&cJSON_Delete)> parsed(cJSON_Parse(json.c_str()), cJSON_Delete);
    const cJSON* member = cJSON_GetObjectItemCaseSensitive(parsed.get(), name);
    if (!cJSON_IsNumber(member)) throw failure(std::string("no number \"") + name + "\" in " + json);
    return static_cast<long long>(member->valuedouble);
}

}  // namespace

TimeServiceSim::TimeServiceSim() : TimeServiceSim(Options{}) {}

TimeServiceSim::TimeServiceSim(Options options) : _program(std::move(options.program)), _statePath(std::move(options.statePath)) {
#ifdef TIKTAL_TIMESERVICE_SIM
    if (_program.empty()) _program = TIKTAL_TIMESERVICE_SIM;
#endif
    if (_program.empty()) throw failure("no program given");
    if (_statePath.empty()) {
        char folder[] = "/tmp/timeservice_sim.XXXXXX";
        if (!mkdtemp(folder)) throw failure(errnoText("mkdtemp"));
        _temporaryFolder = folder;
        _statePath = _temporaryFolder + "/state.json";
    }
    const std::string& address = options.address;
    const std::string listen = (address.find(':') == std::string::npos ? address : "[" + address + "]") + ":0";

    // Everything the child needs is prepared before fork: after it, the child only calls exec.
    std::vector<std::string> arguments = {_program, "--listen", listen, "--state", _statePath};
    std::vector<char*> argv;
    for (std::string& argument : arguments) argv.push_back(argument.data());
    argv.push_back(nullptr);
    int output[2];
    if (pipe2(output, O_CLOEXEC) != 0) {
        const std::string what = errnoText("pipe2");
        removeTemporaryFolder();
        throw failure(what);
    }
    const pid_t parent = getpid();
    _pid = fork();
    if (_pid == 0) {
        prctl(PR_SET_PDEATHSIG, SIGTERM);
        if (getppid() != parent) _exit(126);
        dup2(output[1], STDOUT_FILENO);
        execv(argv[0], argv.data());
        _exit(127);
    }
    close(output[1]);
    if (_pid < 0) {
        const std::string what = errnoText("fork");
        close(output[0]);
        removeTemporaryFolder();
        throw failure(what);
    }

    // Readiness is the first line on the child's standard output.
    std::string text, problem;
    const auto deadline = Clock::now() + kStartLimit;
    while (problem.empty() && text.find('\n') == std::string::npos) {
        const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(deadline - Clock::now()).count();
        pollfd ready{output[0], POLLIN, 0};
        const int polled = left > 0 ? poll(&ready, 1, static_cast<int>(left)) : 0;
        if (polled < 0 && errno == EINTR) continue;
        if (polled == 0) problem = "no \"listening on\" line within 10 s";
        if (polled < 0) problem = errnoText("poll");
        if (!problem.empty()) break;
        char buffer[256];
        const ssize_t got = read(output[0], buffer, sizeof buffer);
        if (got < 0 && errno == EINTR) continue;
        if (got <= 0) problem = _program + " ended before it listened";
        else text.append(buffer, static_cast<size_t>(got));
    }
    close(output[0]);
    const std::string line = text.substr(0, text.find('\n'));
    const std::string prefix = "listening on ";
    if (problem.empty() && line.compare(0, prefix.size(), prefix) != 0) problem = "unexpected output: " + line;
    if (!problem.empty()) {
        const int status = stop();
        removeTemporaryFolder();
        throw failure(problem + " (exit status " + std::to_string(status) + ")");
    }
    _host = line.substr(prefix.size());
}

TimeServiceSim::~TimeServiceSim() {
    stop();
    removeTemporaryFolder();
}

int TimeServiceSim::stop() {
    if (_pid > 0) {
        kill(_pid, SIGTERM);
        _exitStatus = waitForExit(_pid, kStopLimit);
        if (_exitStatus < 0) {  // it did not stop: a fault of the simulator that the caller sees
            kill(_pid, SIGKILL);
            _exitStatus = waitForExit(_pid, kStopLimit);
        }
        _pid = -1;
    }
    return _exitStatus;
}

void TimeServiceSim::removeTemporaryFolder() noexcept {
    if (_temporaryFolder.empty()) return;
    std::error_code ignored;
    std::filesystem::remove_all(_temporaryFolder, ignored);
    _temporaryFolder.clear();
}

std::string TimeServiceSim::url(const std::string& path) const { return "http://" + _host + path; }

std::string TimeServiceSim::resource(const std::string& device) const { return "sync://" + _host + "/" + device; }

std::string TimeServiceSim::control(const char* method, const std::string& path, const std::string& body) {
    static std::once_flag once;
    std::call_once(once, [] { curl_global_init(CURL_GLOBAL_DEFAULT); });
    std::unique_ptr<CURL, decltype(&curl_easy_cleanup)> curl(curl_easy_init(), curl_easy_cleanup);
    if (!curl) throw failure("curl_easy_init failed");
    std::unique_ptr<curl_slist, decltype(&curl_slist_free_all)> headers(
        curl_slist_append(nullptr, "Content-Type: application/json"), curl_slist_free_all);
    const std::string target = url(path);
    std::string response;
    CURL* handle = curl.get();
    curl_easy_setopt(handle, CURLOPT_URL, target.c_str());
    curl_easy_setopt(handle, CURLOPT_CUSTOMREQUEST, method);
    curl_easy_setopt(handle, CURLOPT_NOSIGNAL, 1L);
    curl_easy_setopt(handle, CURLOPT_TIMEOUT_MS, 30000L);
    curl_easy_setopt(handle, CURLOPT_HTTPHEADER, headers.get());
    curl_easy_setopt(handle, CURLOPT_WRITEFUNCTION, appendBody);
    curl_easy_setopt(handle, CURLOPT_WRITEDATA, &response);
    if (std::strcmp(method, "GET") != 0) {
        curl_easy_setopt(handle, CURLOPT_POSTFIELDS, body.data());
        curl_easy_setopt(handle, CURLOPT_POSTFIELDSIZE, static_cast<long>(body.size()));
    }
    const CURLcode code = curl_easy_perform(handle);
    if (code != CURLE_OK) throw failure(std::string(method) + " " + path + ": " + curl_easy_strerror(code));
    long status = 0;
    curl_easy_getinfo(handle, CURLINFO_RESPONSE_CODE, &status);
    if (status != 200) throw failure(std::string(method) + " " + path + ": HTTP " + std::to_string(status) + " " + response);
    return response;
}

void TimeServiceSim::next(const std::string& directiveJson) { control("POST", "/_sim/next", directiveJson); }
long long TimeServiceSim::stat(const char* name) { return numberMember(control("GET", "/_sim/stats"), name); }
long TimeServiceSim::served() { return static_cast<long>(stat("served")); }
long TimeServiceSim::held() { return static_cast<long>(stat("held")); }
long TimeServiceSim::connections() { return static_cast<long>(stat("connections")); }
long long TimeServiceSim::streamed() { return stat("streamed"); }
long TimeServiceSim::streaming() { return static_cast<long>(stat("streaming")); }
std::string TimeServiceSim::lastRequest() { return control("GET", "/_sim/last"); }
void TimeServiceSim::reset() { control("POST", "/_sim/reset"); }
void TimeServiceSim::release() { control("POST", "/_sim/release"); }
std::string TimeServiceSim::state() { return control("GET", "/_sim/state"); }
void TimeServiceSim::replaceState(const std::string& stateJson) { control("PUT", "/_sim/state", stateJson); }
void TimeServiceSim::mergeState(const std::string& patchJson) { control("POST", "/_sim/state", patchJson); }

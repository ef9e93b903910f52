#include "timeservice_sim.h"

#include "child_process.h"

#include <cjson/cJSON.h>
#include <curl/curl.h>
#include <signal.h>

#include <chrono>
#include <cstring>
#include <memory>
#include <mutex>
#include <stdexcept>

namespace {

constexpr std::chrono::milliseconds kStartLimit(10000);
constexpr std::chrono::milliseconds kStopLimit(10000);

std::runtime_error failure(const std::string& what) { return std::runtime_error("TimeServiceSim: " + what); }

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
        _temporaryFolder = tiktaltest::makeTemporaryFolder("timeservice_sim");
        _statePath = _temporaryFolder + "/state.json";
    }
    const std::string& address = options.address;
    const std::string listen = (address.find(':') == std::string::npos ? address : "[" + address + "]") + ":0";

    const tiktaltest::StartedChild child =
        tiktaltest::startChild({_program, "--listen", listen, "--state", _statePath}, "listening on ", kStartLimit);
    _pid = child.pid;
    if (!child.problem.empty()) {
        const int status = stop();
        removeTemporaryFolder();
        throw failure(child.problem + " (exit status " + std::to_string(status) + ")");
    }
    _host = child.ready;
}

TimeServiceSim::~TimeServiceSim() {
    stop();
    removeTemporaryFolder();
}

int TimeServiceSim::stop() {
    if (_pid > 0) _exitStatus = tiktaltest::stopChild(_pid, SIGTERM, kStopLimit);
    _pid = -1;
    return _exitStatus;
}

void TimeServiceSim::removeTemporaryFolder() noexcept {
    tiktaltest::removeFolder(_temporaryFolder);
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

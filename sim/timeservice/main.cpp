// timeservice_sim: a stand-in for the remote time service, for tests and the demo.
//
//   timeservice_sim --listen ADDRESS:PORT --state FILE
//
// Serves the time service's HTTP/1.1 + JSON protocol under /tiktalwebs from the state in FILE (a
// default state is written there when FILE does not exist) and offers test controls under /_sim.
// Listens on loopback addresses only; PORT 0 picks a free port. Once it accepts connections it
// prints the one line "listening on ADDRESS:PORT" with the real port. SIGTERM or SIGINT stop it
// cleanly (exit status 0).
#include "state.h"

#include <arpa/inet.h>
#include <httplib.h>
#include <pthread.h>
#include <signal.h>

#include <atomic>
#include <cctype>
#include <chrono>
#include <cmath>
#include <condition_variable>
#include <cstdio>
#include <cstdlib>
#include <deque>
#include <mutex>
#include <regex>
#include <string>
#include <thread>
#include <vector>

namespace {

using timeservice::Json;
using timeservice::parseJson;
using timeservice::printJson;

constexpr const char* kMediaType = "vnd.zr.tiktal.v1/json; charset=utf-8";
constexpr const char* kControlMediaType = "application/json";
const std::string kServicePrefix = "/tiktalwebs";
// Every connection holds a worker while it is open, and delayed answers hold theirs while they wait.
constexpr std::size_t kWorkerThreads = 32;

// The service's answer before a directive changes it.
struct Answer {
    int status = 200;
    Json body;
};

Answer dataAnswer(Json members) {
    Json body(cJSON_CreateObject());
    cJSON_AddItemToObject(body.get(), "data", members.release());
    return {200, std::move(body)};
}

Answer dataAnswer(const std::string& key, const cJSON* value) {
    Json members(cJSON_CreateObject());
    cJSON_AddItemToObject(members.get(), key.c_str(), cJSON_Duplicate(value, true));
    return dataAnswer(std::move(members));
}

// The error envelope; its error code is the negated HTTP status.
Answer failure(int status, const std::string& text, const std::string& info) {
    Json body(cJSON_CreateObject());
    cJSON* error = cJSON_AddObjectToObject(body.get(), "error");
    cJSON_AddFalseToObject(error, "success");
    cJSON_AddNumberToObject(error, "errorCode", -status);
    cJSON_AddStringToObject(error, "errorText", text.c_str());
    cJSON_AddStringToObject(error, "errorInfo", info.c_str());
    return {status, std::move(body)};
}

std::vector<std::string> split(const std::string& text, char separator) {
    std::vector<std::string> pieces;
    std::size_t start = 0;
    for (std::size_t end; (end = text.find(separator, start)) != std::string::npos; start = end + 1)
        pieces.push_back(text.substr(start, end - start));
    pieces.push_back(text.substr(start));
    return pieces;
}

// Decodes every "%XX"; any byte may arrive encoded. False for a "%" without two hex digits.
bool percentDecode(const std::string& text, std::string& out) {
    out.clear();
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (text[i] != '%') {
            out += text[i];
            continue;
        }
        if (i + 2 >= text.size() || !std::isxdigit(static_cast<unsigned char>(text[i + 1])) ||
            !std::isxdigit(static_cast<unsigned char>(text[i + 2])))
            return false;
        out += static_cast<char>(std::stoi(text.substr(i + 1, 2), nullptr, 16));
        i += 2;
    }
    return true;
}

// A written value arrives as text; the stored member's JSON type decides how it is read: a number
// from decimal text, a Boolean from "1", "0", "true" or "false", a text (or a null member) as it is.
// Null when the text does not fit.
Json convertText(const cJSON* stored, const std::string& text) {
    if (cJSON_IsNumber(stored)) {
        static const std::regex decimal(R"([+-]?(\d+\.?\d*|\.\d+)([eE][+-]?\d+)?)");
        if (!std::regex_match(text, decimal)) return nullptr;
        const double value = std::strtod(text.c_str(), nullptr);
        return std::isfinite(value) ? Json(cJSON_CreateNumber(value)) : nullptr;
    }
    if (cJSON_IsBool(stored)) {
        if (text == "1" || text == "true") return Json(cJSON_CreateTrue());
        if (text == "0" || text == "false") return Json(cJSON_CreateFalse());
        return nullptr;
    }
    if (cJSON_IsString(stored) || cJSON_IsNull(stored)) return Json(cJSON_CreateString(text.c_str()));
    return nullptr;
}

// How the next requests under /tiktalwebs are answered (POST /_sim/next).
struct Directive {
    long count = 1;
    long status = 0;  // 0: the normal status
    long delayMs = 0;
    bool replaceBody = false;
    std::string body;
    std::string error;  // compact JSON of an object merged as "error"; empty for none
    bool wrapResult = false;
};

bool wholeNumber(const cJSON* item, double min, double max, long& out) {
    if (!cJSON_IsNumber(item) || item->valuedouble != std::floor(item->valuedouble) || item->valuedouble < min ||
        item->valuedouble > max)
        return false;
    out = static_cast<long>(item->valuedouble);
    return true;
}

// Empty when the text is a valid directive, otherwise what is wrong with it.
std::string parseDirective(const std::string& text, Directive& directive) {
    const Json json = parseJson(text);
    if (!cJSON_IsObject(json.get())) return "a directive is a JSON object";
    for (const cJSON* member = json->child; member; member = member->next) {
        const std::string name = member->string;
        if (name == "count") {
            if (!wholeNumber(member, 1, 1e9, directive.count)) return "\"count\" must be a whole number from 1";
        } else if (name == "status") {
            if (!wholeNumber(member, 200, 999, directive.status)) return "\"status\" must be a final HTTP status, 200 to 999";
        } else if (name == "delayMs") {
            if (!wholeNumber(member, 0, 3.6e6, directive.delayMs)) return "\"delayMs\" must be a whole number of ms";
        } else if (name == "body") {
            if (!cJSON_IsString(member)) return "\"body\" must be a text";
            directive.replaceBody = true;
            directive.body = member->valuestring;
        } else if (name == "error") {
            if (!cJSON_IsObject(member)) return "\"error\" must be an object";
            directive.error = printJson(member, false);
        } else if (name == "wrapResult") {
            if (!cJSON_IsBool(member)) return "\"wrapResult\" must be a Boolean";
            directive.wrapResult = cJSON_IsTrue(member);
        } else {
            return "unknown directive member \"" + name + "\"";
        }
    }
    return {};
}

// The answer body after the directive: a replacement text as it is; otherwise the normal answer,
// either with the directive's "error" member merged in, or, with "wrapResult", as the value of
// "result" exactly as it is printed unwrapped, with the "error" member beside it.
std::string render(Answer& normal, const Directive& directive) {
    if (directive.replaceBody) return directive.body;
    Json error = directive.error.empty() ? nullptr : parseJson(directive.error);
    if (directive.wrapResult) {
        std::string text = "{\"result\":" + printJson(normal.body.get());
        if (error) text += ",\"error\":" + printJson(error.get(), false);
        return text + "}";
    }
    if (error) {
        cJSON_DeleteItemFromObjectCaseSensitive(normal.body.get(), "error");
        cJSON_AddItemToObject(normal.body.get(), "error", error.release());
    }
    return printJson(normal.body.get());
}

// Objects merge member by member; any other value replaces the target's.
void mergeInto(cJSON* target, const cJSON* patch) {
    for (const cJSON* member = patch->child; member; member = member->next) {
        cJSON* existing = cJSON_GetObjectItemCaseSensitive(target, member->string);
        if (cJSON_IsObject(existing) && cJSON_IsObject(member))
            mergeInto(existing, member);
        else if (existing)
            cJSON_ReplaceItemInObjectCaseSensitive(target, member->string, cJSON_Duplicate(member, true));
        else
            cJSON_AddItemToObject(target, member->string, cJSON_Duplicate(member, true));
    }
}

void reply(httplib::Response& res, int status, const cJSON* body) {
    res.status = status;
    res.set_content(printJson(body), kControlMediaType);
}

void replyError(httplib::Response& res, int status, const std::string& text) {
    Json body(cJSON_CreateObject());
    cJSON_AddStringToObject(body.get(), "error", text.c_str());
    reply(res, status, body.get());
}

class Simulator {
public:
    Simulator(std::string statePath, Json state) : _statePath(std::move(statePath)), _state(std::move(state)) {}

    // Answers one request under /tiktalwebs, after the first queued directive's delay.
    void serve(const httplib::Request& req, httplib::Response& res) {
        const std::size_t mark = req.target.find('?');
        const std::string path = req.target.substr(0, mark);
        const std::string query = mark == std::string::npos ? "" : req.target.substr(mark + 1);
        Directive directive;
        {
            std::lock_guard<std::mutex> lock(_mutex);
            _last = describe(req, path, query);
            if (!_directives.empty()) {
                directive = _directives.front();
                if (--_directives.front().count == 0) _directives.pop_front();
            }
        }
        if (directive.delayMs > 0) hold(directive.delayMs);
        std::lock_guard<std::mutex> lock(_mutex);
        Answer normal = answer(req.method, path, query, req.body);
        ++_served;
        res.status = directive.status ? static_cast<int>(directive.status) : normal.status;
        res.set_content(render(normal, directive), kMediaType);
    }

    // The test controls under /_sim; none of them counts as a served request.
    void control(const httplib::Request& req, httplib::Response& res) {
        const std::string call = req.method + " " + req.path;
        Json answer(cJSON_CreateObject());
        std::lock_guard<std::mutex> lock(_mutex);
        if (call == "POST /_sim/next") {  // queues a directive for the next requests
            Directive directive;
            const std::string fault = parseDirective(req.body, directive);
            if (!fault.empty()) return replyError(res, 400, fault);
            _directives.push_back(directive);
        } else if (call == "GET /_sim/stats") {
            cJSON_AddNumberToObject(answer.get(), "served", static_cast<double>(_served));
            cJSON_AddNumberToObject(answer.get(), "held", _held);
        } else if (call == "GET /_sim/last") {
            if (_last) answer.reset(cJSON_Duplicate(_last.get(), true));
        } else if (call == "POST /_sim/reset") {
            _directives.clear();
            _served = 0;
            _last.reset();
        } else if (call == "POST /_sim/release") {  // ends every delay that is running now
            ++_releases;
            _wake.notify_all();
        } else if (call == "GET /_sim/state") {
            answer.reset(cJSON_Duplicate(_state.get(), true));
        } else if (call == "PUT /_sim/state" || call == "POST /_sim/state") {
            // PUT replaces the state, POST merges into it; neither writes the state file.
            Json patch = parseJson(req.body);
            if (!cJSON_IsObject(patch.get())) return replyError(res, 400, "the body must be a JSON object");
            Json changed(req.method == "PUT" ? patch.release() : cJSON_Duplicate(_state.get(), true));
            if (patch) mergeInto(changed.get(), patch.get());
            const std::string fault = timeservice::checkState(changed.get());
            if (!fault.empty()) return replyError(res, 400, fault);
            _state = std::move(changed);
            answer.reset(cJSON_Duplicate(_state.get(), true));
        } else {
            return replyError(res, 404, "no such control: " + call);
        }
        reply(res, 200, answer.get());
    }

    void stop() {
        std::lock_guard<std::mutex> lock(_mutex);
        _stopping = true;
        _wake.notify_all();
    }

private:
    void hold(long delayMs) {
        std::unique_lock<std::mutex> lock(_mutex);
        ++_held;
        const unsigned releases = _releases;
        _wake.wait_for(lock, std::chrono::milliseconds(delayMs), [&] { return _stopping || _releases != releases; });
        --_held;
    }

    static Json describe(const httplib::Request& req, const std::string& path, const std::string& query) {
        Json last(cJSON_CreateObject());
        cJSON_AddStringToObject(last.get(), "method", req.method.c_str());
        cJSON_AddStringToObject(last.get(), "path", path.c_str());
        cJSON_AddStringToObject(last.get(), "query", query.c_str());
        cJSON_AddStringToObject(last.get(), "body", req.body.c_str());
        cJSON* headers = cJSON_AddObjectToObject(last.get(), "headers");
        for (const auto& [name, value] : req.headers) {
            // The server adds the connection's addresses to the headers; the client sent none of them.
            if (name == "REMOTE_ADDR" || name == "REMOTE_PORT" || name == "LOCAL_ADDR" || name == "LOCAL_PORT") continue;
            const cJSON* earlier = cJSON_GetObjectItemCaseSensitive(headers, name.c_str());
            const std::string joined = earlier ? std::string(earlier->valuestring) + ", " + value : value;
            cJSON_DeleteItemFromObjectCaseSensitive(headers, name.c_str());
            cJSON_AddStringToObject(headers, name.c_str(), joined.c_str());
        }
        return last;
    }

    Answer answer(const std::string& method, const std::string& path, const std::string& query,
                  const std::string& body) {
        if (path.compare(0, kServicePrefix.size() + 1, kServicePrefix + "/") != 0 || path.size() == kServicePrefix.size() + 1)
            return failure(404, "Unknown resource", path);
        std::vector<std::string> names;
        for (const std::string& raw : split(path.substr(kServicePrefix.size() + 1), '/')) {
            names.emplace_back();
            if (!percentDecode(raw, names.back())) return failure(400, "Malformed percent-encoding", raw);
        }
        const bool get = method == "GET", put = method == "PUT";
        if (names.size() == 1 && names[0] == "devices" && get) return deviceList();
        const std::string device = cJSON_GetObjectItemCaseSensitive(_state.get(), "device")->valuestring;
        if (names[0] != device) return failure(404, "Unknown device", names[0]);
        if (names.size() > 3) return failure(404, "Unknown resource", path);
        if (names.size() == 1 && get) return serviceAttributes(query);
        if (names.size() == 2 && put && names[1] == "persist") return persist();
        if (names.size() == 2 && get) return timeReference(names[1]);
        if (names.size() == 3 && get) return member(names[1], names[2]);
        if (names.size() == 3 && put) return write(names[1], names[2], body);
        return failure(405, "Method not allowed", method + " " + path);
    }

    Answer deviceList() const {
        const std::string entry = std::string(cJSON_GetObjectItemCaseSensitive(_state.get(), "deviceListPrefix")->valuestring) +
                                  cJSON_GetObjectItemCaseSensitive(_state.get(), "device")->valuestring;
        Json body(cJSON_CreateObject());
        cJSON_AddItemToArray(cJSON_AddArrayToObject(body.get(), "devices"), cJSON_CreateString(entry.c_str()));
        return {200, std::move(body)};
    }

    cJSON* references() const { return cJSON_GetObjectItemCaseSensitive(_state.get(), "timeReferences"); }

    // GET D answers every service attribute, GET D?attribute=A the one named.
    Answer serviceAttributes(const std::string& query) const {
        Json all(cJSON_CreateObject());
        cJSON* names = cJSON_AddArrayToObject(all.get(), "allTimeReferences");
        for (const cJSON* reference = references()->child; reference; reference = reference->next)
            cJSON_AddItemToArray(names, cJSON_CreateString(reference->string));
        const cJSON* epoch = cJSON_GetObjectItemCaseSensitive(_state.get(), "epochOffsetInNsec");
        if (epoch) {
            cJSON_AddItemToObject(all.get(), "epochOffsetInNsec", cJSON_Duplicate(epoch, true));
        } else {
            const auto now = std::chrono::system_clock::now().time_since_epoch();  // the Unix epoch
            const long long nanos = std::chrono::duration_cast<std::chrono::nanoseconds>(now).count();
            cJSON_AddStringToObject(all.get(), "epochOffsetInNsec", std::to_string(nanos).c_str());
        }
        for (const char* name : {"apiVersion", "selectedTrId", "selectedTrOffsetNanos"}) {
            const cJSON* value = cJSON_GetObjectItemCaseSensitive(_state.get(), name);
            if (value) cJSON_AddItemToObject(all.get(), name, cJSON_Duplicate(value, true));
        }
        bool one = false;
        std::string attribute;
        for (const std::string& parameter : split(query, '&')) {
            const std::size_t equals = parameter.find('=');
            std::string key;
            if (equals == std::string::npos || !percentDecode(parameter.substr(0, equals), key) || key != "attribute")
                continue;
            if (!percentDecode(parameter.substr(equals + 1), attribute))
                return failure(400, "Malformed percent-encoding", parameter);
            one = true;
        }
        if (!one) return dataAnswer(std::move(all));
        const cJSON* value = cJSON_GetObjectItemCaseSensitive(all.get(), attribute.c_str());
        if (!value) return failure(404, "Unknown service attribute", attribute);
        return dataAnswer(attribute, value);
    }

    Answer timeReference(const std::string& name) const {
        const cJSON* reference = cJSON_GetObjectItemCaseSensitive(references(), name.c_str());
        if (!reference) return failure(404, "Unknown time reference", name);
        return dataAnswer(Json(cJSON_Duplicate(reference, true)));
    }

    Answer member(const std::string& name, const std::string& key) const {
        const cJSON* reference = cJSON_GetObjectItemCaseSensitive(references(), name.c_str());
        if (!reference) return failure(404, "Unknown time reference", name);
        const cJSON* value = cJSON_GetObjectItemCaseSensitive(reference, key.c_str());
        if (!value) return failure(404, "Unknown attribute", name + "/" + key);
        return dataAnswer(key, value);
    }

    bool readOnly(const std::string& key) const {
        const cJSON* keys = cJSON_GetObjectItemCaseSensitive(_state.get(), "readOnlyKeys");
        for (const cJSON* entry = keys ? keys->child : nullptr; entry; entry = entry->next)
            if (key == entry->valuestring) return true;
        return false;
    }

    // PUT D/T/A with {"version":1,"data":{"A":"text"}}.
    Answer write(const std::string& name, const std::string& key, const std::string& body) {
        cJSON* reference = cJSON_GetObjectItemCaseSensitive(references(), name.c_str());
        if (!reference) return failure(404, "Unknown time reference", name);
        const cJSON* stored = cJSON_GetObjectItemCaseSensitive(reference, key.c_str());
        if (!stored) return failure(404, "Unknown attribute", name + "/" + key);
        const Json request = parseJson(body);
        const cJSON* version = cJSON_GetObjectItemCaseSensitive(request.get(), "version");
        const cJSON* data = cJSON_GetObjectItemCaseSensitive(request.get(), "data");
        if (!cJSON_IsObject(request.get()) || !cJSON_IsNumber(version) || version->valuedouble != 1 ||
            !cJSON_IsObject(data))
            return failure(400, "Malformed request body", body);
        const cJSON* value = cJSON_GetObjectItemCaseSensitive(data, key.c_str());
        if (!cJSON_IsString(value)) return failure(400, "The body holds no text for the attribute", body);
        if (readOnly(key)) return failure(400, "Read-only attribute", key);
        Json converted = convertText(stored, value->valuestring);
        if (!converted) return failure(400, "Value does not fit the attribute", key + " = " + value->valuestring);
        cJSON_ReplaceItemInObjectCaseSensitive(reference, key.c_str(), converted.release());
        return dataAnswer(key, cJSON_GetObjectItemCaseSensitive(reference, key.c_str()));
    }

    Answer persist() {
        try {
            timeservice::saveState(_statePath, _state.get());
        } catch (const std::exception& e) {
            return failure(500, "Could not write the state file", e.what());
        }
        return dataAnswer(Json(cJSON_CreateObject()));
    }

    std::mutex _mutex;
    std::condition_variable _wake;
    const std::string _statePath;
    Json _state;
    std::deque<Directive> _directives;
    long _served = 0;
    int _held = 0;
    unsigned _releases = 0;
    bool _stopping = false;
    Json _last;
};

// "A.B.C.D:PORT" or "[IPv6]:PORT" with a numeric loopback address. Empty when it is one, otherwise
// what is wrong with it.
std::string parseListen(const std::string& text, std::string& address, int& port) {
    const std::size_t colon = text.rfind(':');
    if (colon == std::string::npos) return "expected ADDRESS:PORT";
    address = text.substr(0, colon);
    const std::string portText = text.substr(colon + 1);
    if (address.size() >= 2 && address.front() == '[' && address.back() == ']')
        address = address.substr(1, address.size() - 2);
    if (portText.empty() || portText.size() > 5 || portText.find_first_not_of("0123456789") != std::string::npos ||
        std::stoi(portText) > 65535)
        return "bad port \"" + portText + "\"";
    port = std::stoi(portText);
    in_addr v4{};
    in6_addr v6{};
    if (inet_pton(AF_INET, address.c_str(), &v4) == 1) {
        if ((ntohl(v4.s_addr) >> 24) != 127) return address + " is not a loopback address";
    } else if (inet_pton(AF_INET6, address.c_str(), &v6) == 1) {
        if (!IN6_IS_ADDR_LOOPBACK(&v6)) return address + " is not a loopback address";
    } else {
        return "\"" + address + "\" is not a numeric IPv4 or IPv6 address";
    }
    return {};
}

}  // namespace

int main(int argc, char** argv) {
    std::string listen, statePath;
    bool usage = argc != 5;
    for (int i = 1; !usage && i < argc; i += 2) {
        const std::string option = argv[i];
        if (option == "--listen")
            listen = argv[i + 1];
        else if (option == "--state")
            statePath = argv[i + 1];
        else
            usage = true;
    }
    if (usage || listen.empty() || statePath.empty()) {
        std::fprintf(stderr, "usage: timeservice_sim --listen ADDRESS:PORT --state FILE\n");
        return 2;
    }
    std::string address;
    int port = 0;
    const std::string fault = parseListen(listen, address, port);
    if (!fault.empty()) {
        std::fprintf(stderr, "timeservice_sim: --listen %s: %s (a test stand-in listens on loopback only)\n",
                     listen.c_str(), fault.c_str());
        return 2;
    }
    Json state;
    try {
        state = timeservice::loadState(statePath);
    } catch (const std::exception& e) {
        std::fprintf(stderr, "timeservice_sim: %s\n", e.what());
        return 2;
    }

    // Signals are taken by one thread with sigwait; every other thread, the server's included, has
    // them blocked. A peer that goes away must not end the program.
    sigset_t signals;
    sigemptyset(&signals);
    sigaddset(&signals, SIGTERM);
    sigaddset(&signals, SIGINT);
    pthread_sigmask(SIG_BLOCK, &signals, nullptr);
    signal(SIGPIPE, SIG_IGN);

    Simulator sim(statePath, std::move(state));
    httplib::Server server;
    server.new_task_queue = [] { return new httplib::ThreadPool(kWorkerThreads); };
    server.set_tcp_nodelay(true);  // answers go out at once, not after the peer's delayed ACK
    // One request per connection ("Connection: close"): the server joins every connection's worker
    // before it returns, and an idle kept-alive connection would hold a stop up for seconds.
    server.set_keep_alive_max_count(1);
    const auto control = [&](const httplib::Request& req, httplib::Response& res) { sim.control(req, res); };
    const char* controls = R"(/_sim/[\s\S]*)";
    server.Get(controls, control).Put(controls, control).Post(controls, control);
    // Everything else: the service when the raw path is under /tiktalwebs, else a plain 404. Routing
    // sees the decoded path; the service decodes the raw one segment by segment itself.
    const auto anyOther = [&](const httplib::Request& req, httplib::Response& res) {
        if (req.target.compare(0, kServicePrefix.size(), kServicePrefix) == 0) return sim.serve(req, res);
        replyError(res, 404, "no such path");
    };
    const char* everything = R"([\s\S]*)";
    server.Get(everything, anyOther).Put(everything, anyOther).Post(everything, anyOther);
    server.Delete(everything, anyOther).Patch(everything, anyOther);

    const int bound = port == 0 ? server.bind_to_any_port(address) : (server.bind_to_port(address, port) ? port : -1);
    if (bound <= 0) {
        std::fprintf(stderr, "timeservice_sim: cannot listen on %s\n", listen.c_str());
        return 1;
    }

    std::atomic<bool> finished{false};
    std::thread waiter([&] {
        int received = 0;
        sigwait(&signals, &received);
        sim.stop();  // ends running delays, so the workers can be joined
        // The server stops only once it runs; a signal may come before listen_after_bind started.
        while (!finished) {
            if (server.is_running()) {
                server.stop();
                break;
            }
            std::this_thread::sleep_for(std::chrono::milliseconds(1));
        }
    });

    const std::string shown = address.find(':') == std::string::npos ? address : "[" + address + "]";
    std::printf("listening on %s:%d\n", shown.c_str(), bound);
    std::fflush(stdout);
    const bool listened = server.listen_after_bind();
    finished = true;
    pthread_kill(waiter.native_handle(), SIGTERM);  // wakes the waiter when the server ended on its own
    waiter.join();
    return listened ? 0 : 1;
}

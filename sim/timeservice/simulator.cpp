#include "simulator.h"

#include "connections.h"

#include <chrono>

namespace timeservice {
namespace {

// The request as the test controls show it: method, path and query as sent, body and headers.
Json describe(const httplib::Request& req, const ServiceRequest& request) {
    Json last(cJSON_CreateObject());
    cJSON_AddStringToObject(last.get(), "method", request.method.c_str());
    cJSON_AddStringToObject(last.get(), "path", request.path.c_str());
    cJSON_AddStringToObject(last.get(), "query", request.query.c_str());
    cJSON_AddStringToObject(last.get(), "body", request.body.c_str());
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

ServiceRequest serviceRequest(const httplib::Request& req) {
    const std::size_t mark = req.target.find('?');
    return {req.method, req.target.substr(0, mark), mark == std::string::npos ? "" : req.target.substr(mark + 1),
            req.body};
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

}  // namespace

Simulator::Simulator(std::string statePath, Json state) : _statePath(std::move(statePath)), _state(std::move(state)) {}

void Simulator::serve(const httplib::Request& req, httplib::Response& res) {
    const ServiceRequest request = serviceRequest(req);
    const Directive directive = takeDirective(req, request);
    if (directive.delayMs > 0) hold(directive.delayMs);
    std::lock_guard<std::mutex> lock(_mutex);
    Answer normal = answer(_state.get(), _statePath, request);
    ++_served;
    res.status = directive.status ? static_cast<int>(directive.status) : normal.status;
    if (directive.repeat > 0) return streamBody(res, directive.body, directive.repeat, directive.chunked, _streams);
    const std::string text = render(normal, directive);
    if (directive.chunked) return streamBody(res, text, 1, true, _streams);
    res.set_content(text, kMediaType);
}

// Records the request, counts its connection once since the last reset, and takes its directive.
Directive Simulator::takeDirective(const httplib::Request& req, const ServiceRequest& request) {
    std::lock_guard<std::mutex> lock(_mutex);
    _last = describe(req, request);
    if (firstCallOnConnection(_resets)) ++_connections;
    if (_directives.empty()) return {};
    Directive directive = _directives.front();
    if (--_directives.front().count == 0) _directives.pop_front();
    return directive;
}

void Simulator::hold(long long delayMs) {
    std::unique_lock<std::mutex> lock(_mutex);
    ++_held;
    const unsigned releases = _releases;
    _wake.wait_for(lock, std::chrono::milliseconds(delayMs), [&] { return _stopping || _releases != releases; });
    --_held;
}

void Simulator::queue(const Directive& directive) {
    std::lock_guard<std::mutex> lock(_mutex);
    _directives.push_back(directive);
}

Json Simulator::stats() {
    std::lock_guard<std::mutex> lock(_mutex);
    Json stats(cJSON_CreateObject());
    cJSON_AddNumberToObject(stats.get(), "served", static_cast<double>(_served));
    cJSON_AddNumberToObject(stats.get(), "held", _held);
    cJSON_AddNumberToObject(stats.get(), "connections", static_cast<double>(_connections));
    cJSON_AddNumberToObject(stats.get(), "streamed", static_cast<double>(_streams.bytes));
    cJSON_AddNumberToObject(stats.get(), "streaming", static_cast<double>(_streams.running));
    return stats;
}

Json Simulator::lastRequest() {
    std::lock_guard<std::mutex> lock(_mutex);
    return Json(_last ? cJSON_Duplicate(_last.get(), true) : cJSON_CreateObject());
}

void Simulator::reset() {
    std::lock_guard<std::mutex> lock(_mutex);
    _directives.clear();
    _served = 0;
    _connections = 0;
    ++_resets;
    _streams.bytes = 0;
    _last.reset();
}

void Simulator::release() {
    std::lock_guard<std::mutex> lock(_mutex);
    ++_releases;
    _wake.notify_all();
}

Json Simulator::state() {
    std::lock_guard<std::mutex> lock(_mutex);
    return Json(cJSON_Duplicate(_state.get(), true));
}

std::string Simulator::changeState(Json patch, bool replace) {
    std::lock_guard<std::mutex> lock(_mutex);
    Json changed(replace ? patch.release() : cJSON_Duplicate(_state.get(), true));
    if (patch) mergeInto(changed.get(), patch.get());
    std::string fault = checkState(changed.get());
    if (fault.empty()) _state = std::move(changed);
    return fault;
}

void Simulator::stop() {
    std::lock_guard<std::mutex> lock(_mutex);
    _stopping = true;
    _wake.notify_all();
}

}  // namespace timeservice

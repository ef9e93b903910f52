#include "controls.h"

#include <functional>
#include <map>

namespace timeservice {
namespace {

constexpr const char* kControlMediaType = "application/json";

Answer done(Json body = Json(cJSON_CreateObject())) { return {200, std::move(body)}; }

Answer refused(int status, const std::string& text) {
    Json body(cJSON_CreateObject());
    cJSON_AddStringToObject(body.get(), "error", text.c_str());
    return {status, std::move(body)};
}

// POST /_sim/next: queues a directive for the next service requests.
Answer next(Simulator& sim, const httplib::Request& req) {
    Directive directive;
    const std::string fault = parseDirective(req.body, directive);
    if (!fault.empty()) return refused(400, fault);
    sim.queue(directive);
    return done();
}

// PUT /_sim/state replaces the state, POST /_sim/state merges into it; neither writes the state file.
Answer changeState(Simulator& sim, const httplib::Request& req) {
    Json patch = parseJson(req.body);
    if (!cJSON_IsObject(patch.get())) return refused(400, "the body must be a JSON object");
    const std::string fault = sim.changeState(std::move(patch), req.method == "PUT");
    if (!fault.empty()) return refused(400, fault);
    return done(sim.state());
}

using Control = std::function<Answer(Simulator& sim, const httplib::Request& req)>;

const std::map<std::string, Control>& controls() {
    static const std::map<std::string, Control> table = {
        {"POST /_sim/next", next},
        {"GET /_sim/stats", [](Simulator& sim, const httplib::Request&) { return done(sim.stats()); }},
        {"GET /_sim/last", [](Simulator& sim, const httplib::Request&) { return done(sim.lastRequest()); }},
        {"POST /_sim/reset", [](Simulator& sim, const httplib::Request&) { sim.reset(); return done(); }},
        {"POST /_sim/release", [](Simulator& sim, const httplib::Request&) { sim.release(); return done(); }},
        {"GET /_sim/state", [](Simulator& sim, const httplib::Request&) { return done(sim.state()); }},
        {"PUT /_sim/state", changeState},
        {"POST /_sim/state", changeState},
    };
    return table;
}

void reply(httplib::Response& res, const Answer& answer) {
    res.status = answer.status;
    res.set_content(printJson(answer.body.get()), kControlMediaType);
}

}  // namespace

void control(Simulator& sim, const httplib::Request& req, httplib::Response& res) {
    const std::string call = req.method + " " + req.path;
    const auto found = controls().find(call);
    reply(res, found == controls().end() ? refused(404, "no such control: " + call) : found->second(sim, req));
}

void refuse(httplib::Response& res, int status, const std::string& text) { reply(res, refused(status, text)); }

}  // namespace timeservice

#include "controls.h"

#include <cjson/cJSON.h>

#include "deviceRequests.h"

#include <cmath>
#include <functional>
#include <map>
#include <memory>
#include <stdexcept>

namespace devd {
namespace {

struct JsonDeleter {
    void operator()(cJSON* item) const { cJSON_Delete(item); }
};
using Json = std::unique_ptr<cJSON, JsonDeleter>;

// A command that cannot be carried out; its text becomes the answer's "error".
struct Refusal : std::runtime_error {
    using std::runtime_error::runtime_error;
};

// The integer member `name` of the command, within [low, high]; `fallback` when it is absent and
// one is given.
long long integer(const cJSON* command, const char* name, double low, double high, const long long* fallback = nullptr) {
    const cJSON* member = cJSON_GetObjectItemCaseSensitive(command, name);
    if (!member && fallback) return *fallback;
    if (!cJSON_IsNumber(member) || std::trunc(member->valuedouble) != member->valuedouble ||
        member->valuedouble < low || member->valuedouble > high)
        throw Refusal(std::string("\"") + name + "\" must be an integer from " + std::to_string(static_cast<long long>(low)) +
                      " to " + std::to_string(static_cast<long long>(high)));
    return static_cast<long long>(member->valuedouble);
}

std::uint32_t code(const cJSON* command) { return static_cast<std::uint32_t>(integer(command, "code", 0, 4294967295.0)); }

int count(const cJSON* command) {
    static const long long one = 1;
    return static_cast<int>(integer(command, "count", 1, 1e9, &one));
}

std::string hex(const Bytes& bytes) {
    static const char digits[] = "0123456789abcdef";
    std::string text;
    for (const std::uint8_t byte : bytes) text += {digits[byte >> 4], digits[byte & 15]};
    return text;
}


Json packets(Daemon& daemon) {
    Json list(cJSON_CreateArray());
    for (const RecordedPacket& packet : daemon.record.all()) {
        cJSON* item = cJSON_CreateObject();
        cJSON_AddNumberToObject(item, "code", packet.code);
        for (const auto& request : tiktalq300::requests::kRequests)
            if (request.code == packet.code) cJSON_AddStringToObject(item, "request", request.name);
        cJSON_AddNumberToObject(item, "outputSize", packet.outputSize);
        cJSON_AddItemToObject(item, "input", cJSON_CreateString(hex(packet.input).c_str()));
        cJSON_AddItemToArray(list.get(), item);
    }
    return list;
}

Json armedWaits(Daemon& daemon) {
    Json list(cJSON_CreateArray());
    for (const auto& wait : daemon.waits.armed()) {
        cJSON* item = cJSON_CreateObject();
        cJSON_AddNumberToObject(item, "id", static_cast<double>(wait->id()));
        cJSON_AddNumberToObject(item, "arg1", wait->arg1());
        cJSON_AddNumberToObject(item, "arg2", wait->arg2());
        cJSON_AddNumberToObject(item, "arg3", wait->arg3());
        cJSON_AddItemToArray(list.get(), item);
    }
    return list;
}

Json terminalValues(Daemon& daemon) {
    Json list(cJSON_CreateArray());
    for (const auto& [terminal, value] : daemon.device.terminalValues()) {
        cJSON* item = cJSON_CreateObject();
        cJSON_AddNumberToObject(item, "terminal", terminal);
        cJSON_AddNumberToObject(item, "value", value);
        cJSON_AddItemToArray(list.get(), item);
    }
    return list;
}

// A command adds what it reports to the answer, or throws a Refusal.
using Command = std::function<void(Daemon& daemon, const cJSON* command, cJSON* answer)>;

const std::map<std::string, Command>& commands() {
    static const std::map<std::string, Command> table = {
        {"failNext", [](Daemon& d, const cJSON* c, cJSON*) {
             d.directives.failNext(code(c), static_cast<std::int32_t>(integer(c, "status", -2147483648.0, 2147483647.0)), count(c));
         }},
        {"failSystemCall", [](Daemon& d, const cJSON* c, cJSON*) {
             d.directives.failSystemCall(code(c), static_cast<int>(integer(c, "errno", 1, 4095)), count(c),
                                         cJSON_IsTrue(cJSON_GetObjectItemCaseSensitive(c, "output")));
         }},
        {"delayNext", [](Daemon& d, const cJSON* c, cJSON*) {
             d.directives.delayNext(code(c), static_cast<int>(integer(c, "ms", 0, 3600000)), count(c));
         }},
        {"closeOnNext", [](Daemon& d, const cJSON* c, cJSON*) { d.directives.closeOnNext(code(c), count(c)); }},
        {"signalWait", [](Daemon& d, const cJSON* c, cJSON*) {
             const long long id = integer(c, "id", 0, 4294967295.0);
             if (!d.waits.end(static_cast<std::uint64_t>(id), Outcome::Signalled))
                 throw Refusal("no armed wait " + std::to_string(id));
         }},
        {"armedWaits", [](Daemon& d, const cJSON*, cJSON* a) { cJSON_AddItemToObject(a, "waits", armedWaits(d).release()); }},
        {"packets", [](Daemon& d, const cJSON*, cJSON* a) { cJSON_AddItemToObject(a, "packets", packets(d).release()); }},
        {"clearPackets", [](Daemon& d, const cJSON*, cJSON*) { d.record.clear(); }},
        {"terminalValues", [](Daemon& d, const cJSON*, cJSON* a) {
             cJSON_AddItemToObject(a, "values", terminalValues(d).release());
         }},
    };
    return table;
}

std::string print(const Json& answer) {
    std::unique_ptr<char, decltype(&cJSON_free)> text(cJSON_PrintUnformatted(answer.get()), cJSON_free);
    return text ? text.get() : R"({"ok":false,"error":"out of memory"})";
}

}  // namespace

std::string runControl(Daemon& daemon, const std::string& commandLine) {
    Json answer(cJSON_CreateObject());
    try {
        const Json command(cJSON_ParseWithLength(commandLine.data(), commandLine.size()));
        const cJSON* name = cJSON_GetObjectItemCaseSensitive(command.get(), "command");
        if (!cJSON_IsString(name)) throw Refusal("expected a JSON object with a \"command\" text");
        const auto found = commands().find(name->valuestring);
        if (found == commands().end()) throw Refusal(std::string("no such command: ") + name->valuestring);
        found->second(daemon, command.get(), answer.get());
        cJSON_AddTrueToObject(answer.get(), "ok");
    } catch (const Refusal& refusal) {
        answer.reset(cJSON_CreateObject());
        cJSON_AddFalseToObject(answer.get(), "ok");
        cJSON_AddStringToObject(answer.get(), "error", refusal.what());
    }
    return print(answer);
}

}  // namespace devd

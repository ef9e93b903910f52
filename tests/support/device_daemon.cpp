#include "device_daemon.h"

#include "child_process.h"

#include <cjson/cJSON.h>
#include <signal.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstring>
#include <memory>
#include <stdexcept>

namespace {

constexpr std::chrono::milliseconds kStartLimit(10000);
constexpr std::chrono::milliseconds kStopLimit(10000);
constexpr int kControlTimeoutSeconds = 30;

std::runtime_error failure(const std::string& what) { return std::runtime_error("DeviceDaemon: " + what); }

struct JsonDeleter {
    void operator()(cJSON* item) const { cJSON_Delete(item); }
};
using Json = std::unique_ptr<cJSON, JsonDeleter>;

// A stream connection to the control socket, closed with the object.
class ControlConnection {
public:
    explicit ControlConnection(const std::string& path) : _fd(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        if (_fd < 0 || path.size() >= sizeof address.sun_path) throw failure("cannot reach " + path);
        std::memcpy(address.sun_path, path.c_str(), path.size() + 1);
        const timeval timeout{kControlTimeoutSeconds, 0};
        setsockopt(_fd, SOL_SOCKET, SO_RCVTIMEO, &timeout, sizeof timeout);
        if (connect(_fd, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0)
            throw failure("connect " + path + ": " + std::strerror(errno));
    }
    ~ControlConnection() {
        if (_fd >= 0) close(_fd);
    }
    ControlConnection(const ControlConnection&) = delete;
    ControlConnection& operator=(const ControlConnection&) = delete;

    std::string exchange(std::string line) {
        line += '\n';
        if (send(_fd, line.data(), line.size(), MSG_NOSIGNAL) != static_cast<ssize_t>(line.size()))
            throw failure("cannot send a control");
        std::string answer;
        char buffer[4096];
        while (answer.find('\n') == std::string::npos) {
            const ssize_t got = recv(_fd, buffer, sizeof buffer, 0);
            if (got < 0 && errno == EINTR) continue;
            if (got <= 0) throw failure("no answer to " + line);
            answer.append(buffer, static_cast<std::size_t>(got));
        }
        return answer.substr(0, answer.find('\n'));
    }

private:
    int _fd;
};

Json parse(const std::string& text) {
    Json parsed(cJSON_Parse(text.c_str()));
    if (!parsed) throw failure("not JSON: " + text);
    return parsed;
}

const cJSON* arrayMember(const cJSON* object, const char* name) {
    const cJSON* member = cJSON_GetObjectItemCaseSensitive(object, name);
    if (!cJSON_IsArray(member)) throw failure(std::string("no array \"") + name + "\"");
    return member;
}

double number(const cJSON* object, const char* name) {
    const cJSON* member = cJSON_GetObjectItemCaseSensitive(object, name);
    if (!cJSON_IsNumber(member)) throw failure(std::string("no number \"") + name + "\"");
    return member->valuedouble;
}

std::vector<std::uint8_t> fromHex(const char* text) {
    std::vector<std::uint8_t> bytes;
    for (std::size_t i = 0; text[i] && text[i + 1]; i += 2)
        bytes.push_back(static_cast<std::uint8_t>(std::stoi(std::string(text + i, 2), nullptr, 16)));
    return bytes;
}

std::string command(const char* name, const std::string& members = {}) {
    return std::string(R"({"command":")") + name + "\"" + (members.empty() ? "" : "," + members) + "}";
}

std::string member(const char* name, long long value) { return std::string("\"") + name + "\":" + std::to_string(value); }

}  // namespace

DeviceDaemon::DeviceDaemon() : _temporaryFolder(tiktaltest::makeTemporaryFolder("tiktal_devd")) {
    _path = _temporaryFolder + "/tiktal0";
    start();
}

DeviceDaemon::DeviceDaemon(std::string socketPath) : _path(std::move(socketPath)) { start(); }

void DeviceDaemon::start() {
#ifdef TIKTAL_DEVD
    _program = TIKTAL_DEVD;
#endif
    const tiktaltest::StartedChild child =
        tiktaltest::startChild({_program, "--socket", _path}, "listening on ", kStartLimit);
    _pid = child.pid;
    if (child.problem.empty()) return;
    const int status = stop();
    tiktaltest::removeFolder(_temporaryFolder);
    throw failure(child.problem + " (exit status " + std::to_string(status) + ")");
}

DeviceDaemon::~DeviceDaemon() {
    stop();
    tiktaltest::removeFolder(_temporaryFolder);
}

void DeviceDaemon::end(int signal) {
    if (_pid > 0) _exitStatus = tiktaltest::stopChild(_pid, signal, kStopLimit);
    _pid = -1;
}

int DeviceDaemon::stop() {
    end(SIGTERM);
    return _exitStatus;
}

void DeviceDaemon::kill() { end(SIGKILL); }

std::string DeviceDaemon::control(const std::string& commandJson) {
    ControlConnection connection(_path + ".control");
    const std::string answer = connection.exchange(commandJson);
    const Json parsed = parse(answer);
    if (!cJSON_IsTrue(cJSON_GetObjectItemCaseSensitive(parsed.get(), "ok"))) throw failure(commandJson + ": " + answer);
    return answer;
}

void DeviceDaemon::failNext(std::uint32_t code, std::int32_t driverStatus, int count) {
    control(command("failNext", member("code", code) + "," + member("status", driverStatus) + "," + member("count", count)));
}

void DeviceDaemon::failSystemCall(std::uint32_t code, int osError, int count, bool withOutput) {
    control(command("failSystemCall", member("code", code) + "," + member("errno", osError) + "," + member("count", count) +
                                          (withOutput ? ",\"output\":true" : "")));
}

void DeviceDaemon::delayNext(std::uint32_t code, int milliseconds) {
    control(command("delayNext", member("code", code) + "," + member("ms", milliseconds)));
}

void DeviceDaemon::closeOnNext(std::uint32_t code) { control(command("closeOnNext", member("code", code))); }

std::vector<std::uint64_t> DeviceDaemon::armedWaits() {
    const Json answer = parse(control(command("armedWaits")));
    std::vector<std::uint64_t> ids;
    const cJSON* wait = nullptr;
    cJSON_ArrayForEach(wait, arrayMember(answer.get(), "waits")) ids.push_back(static_cast<std::uint64_t>(number(wait, "id")));
    return ids;
}

void DeviceDaemon::signalWait(std::uint64_t id) { control(command("signalWait", member("id", static_cast<long long>(id)))); }

std::vector<DeviceDaemon::Packet> DeviceDaemon::packets() {
    const Json answer = parse(control(command("packets")));
    std::vector<Packet> packets;
    const cJSON* packet = nullptr;
    cJSON_ArrayForEach(packet, arrayMember(answer.get(), "packets")) {
        const cJSON* input = cJSON_GetObjectItemCaseSensitive(packet, "input");
        if (!cJSON_IsString(input)) throw failure("a packet without its input");
        packets.push_back({static_cast<std::uint32_t>(number(packet, "code")),
                           static_cast<std::uint32_t>(number(packet, "outputSize")), fromHex(input->valuestring)});
    }
    return packets;
}

void DeviceDaemon::clearPackets() { control(command("clearPackets")); }

std::map<std::uint32_t, std::uint32_t> DeviceDaemon::terminalValues() {
    const Json answer = parse(control(command("terminalValues")));
    std::map<std::uint32_t, std::uint32_t> values;
    const cJSON* entry = nullptr;
    cJSON_ArrayForEach(entry, arrayMember(answer.get(), "values"))
        values[static_cast<std::uint32_t>(number(entry, "terminal"))] = static_cast<std::uint32_t>(number(entry, "value"));
    return values;
}

// timeservice_sim: a stand-in for the remote time service, for tests and the demo.
//
//   timeservice_sim --listen ADDRESS:PORT --state FILE
//
// Serves the time service's HTTP/1.1 + JSON protocol under /tiktalwebs from the state in FILE (a
// default state is written there when FILE does not exist) and offers test controls under /_sim.
// Listens on loopback addresses only; PORT 0 picks a free port. Once it accepts connections it
// prints the one line "listening on ADDRESS:PORT" with the real port. SIGTERM or SIGINT stop it
// cleanly (exit status 0).
#include "connections.h"
#include "controls.h"
#include "simulator.h"
#include "stop_signals.h"

#include <arpa/inet.h>
#include <httplib.h>
#include <pthread.h>
#include <signal.h>

#include <atomic>
#include <chrono>
#include <cstdio>
#include <limits>
#include <string>
#include <thread>

namespace {

using timeservice::Json;
using timeservice::Simulator;

// An idle kept-alive connection is closed after this long without a request. A stop does not wait
// for it (shutReceivingSides).
constexpr time_t kKeepAliveSeconds = 60;

struct Arguments {
    std::string listen;
    std::string statePath;
    std::string address;  // of `listen`, without brackets
    int port = 0;
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

// Reads the command line; false after saying on standard error why it cannot be used.
bool readArguments(int argc, char** argv, Arguments& arguments) {
    bool usage = argc != 5;
    for (int i = 1; !usage && i < argc; i += 2) {
        const std::string option = argv[i];
        if (option == "--listen")
            arguments.listen = argv[i + 1];
        else if (option == "--state")
            arguments.statePath = argv[i + 1];
        else
            usage = true;
    }
    if (usage || arguments.listen.empty() || arguments.statePath.empty()) {
        std::fprintf(stderr, "usage: timeservice_sim --listen ADDRESS:PORT --state FILE\n");
        return false;
    }
    const std::string fault = parseListen(arguments.listen, arguments.address, arguments.port);
    if (fault.empty()) return true;
    std::fprintf(stderr, "timeservice_sim: --listen %s: %s (a test stand-in listens on loopback only)\n",
                 arguments.listen.c_str(), fault.c_str());
    return false;
}

void configure(httplib::Server& server, Simulator& sim) {
    server.new_task_queue = [] { return new timeservice::ConnectionThreads; };
    server.set_tcp_nodelay(true);  // answers go out at once, not after the peer's delayed ACK
    // A connection serves any number of requests, as a real service's does, until the client
    // closes it or leaves it idle for kKeepAliveSeconds.
    server.set_keep_alive_max_count(std::numeric_limits<std::size_t>::max());
    server.set_keep_alive_timeout(kKeepAliveSeconds);

    const auto control = [&sim](const httplib::Request& req, httplib::Response& res) { timeservice::control(sim, req, res); };
    const char* controls = R"(/_sim/[\s\S]*)";
    server.Get(controls, control).Put(controls, control).Post(controls, control);
    // Everything else: the service when the raw path is under /tiktalwebs, else a plain 404. Routing
    // sees the decoded path; the service decodes the raw one segment by segment itself.
    const auto anyOther = [&sim](const httplib::Request& req, httplib::Response& res) {
        if (req.target.compare(0, timeservice::kServicePrefix.size(), timeservice::kServicePrefix) == 0)
            return sim.serve(req, res);
        timeservice::refuse(res, 404, "no such path");
    };
    const char* everything = R"([\s\S]*)";
    server.Get(everything, anyOther).Put(everything, anyOther).Post(everything, anyOther);
    server.Delete(everything, anyOther).Patch(everything, anyOther);
}

// Waits for SIGTERM or SIGINT (or for the server to end on its own), then stops the server: the
// delays end, the listening socket closes, and the idle kept-alive connections end at once.
void stopOnSignal(const sigset_t& signals, Simulator& sim, httplib::Server& server, int port,
                  const std::atomic<bool>& finished) {
    int received = 0;
    sigwait(&signals, &received);
    sim.stop();
    // The server stops only once it runs; a signal may come before listen_after_bind started.
    while (!finished) {
        if (server.is_running()) {
            server.stop();
            timeservice::shutReceivingSides(port);
            return;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
}

}  // namespace

int main(int argc, char** argv) {
    Arguments arguments;
    if (!readArguments(argc, argv, arguments)) return 2;
    Json state;
    try {
        state = timeservice::loadState(arguments.statePath);
    } catch (const std::exception& e) {
        std::fprintf(stderr, "timeservice_sim: %s\n", e.what());
        return 2;
    }
    const sigset_t signals = simcommon::blockStopSignals();  // the server's threads too

    Simulator sim(arguments.statePath, std::move(state));
    httplib::Server server;
    configure(server, sim);
    const std::string& address = arguments.address;
    const int bound = arguments.port == 0 ? server.bind_to_any_port(address)
                                          : (server.bind_to_port(address, arguments.port) ? arguments.port : -1);
    if (bound <= 0) {
        std::fprintf(stderr, "timeservice_sim: cannot listen on %s\n", arguments.listen.c_str());
        return 1;
    }

    std::atomic<bool> finished{false};
    std::thread waiter(stopOnSignal, std::cref(signals), std::ref(sim), std::ref(server), bound, std::cref(finished));
    const std::string shown = address.find(':') == std::string::npos ? address : "[" + address + "]";
    std::printf("listening on %s:%d\n", shown.c_str(), bound);
    std::fflush(stdout);
    const bool listened = server.listen_after_bind();
    finished = true;
    pthread_kill(waiter.native_handle(), SIGTERM);  // wakes the waiter when the server ended on its own
    waiter.join();
    return listened ? 0 : 1;
}

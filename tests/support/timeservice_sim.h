// Starts the time-service stand-in (timeservice_sim) as a child process and drives its test
// controls under /_sim.
//
//   TimeServiceSim sim;                       // 127.0.0.2, a free port, a fresh state file
//   sim.next(R"({"status":500})");           // the next service request is answered with 500
//   open a session on sim.resource() ...      // "sync://127.0.0.2:PORT/sync_1"
//   EXPECT_EQ(sim.served(), 1);
//
// The constructor returns once the program listens, and throws std::runtime_error when it does not
// within 10 s. The destructor stops it with SIGTERM and waits for it. The child is also sent SIGTERM
// when the thread that started it ends, so a crashed test leaves no server behind: start it from a
// thread that outlives it.
#pragma once

#include <sys/types.h>

#include <string>

class TimeServiceSim {
public:
    struct Options {
        std::string program;              // empty: the build's timeservice_sim
        std::string address = "127.0.0.2";  // a loopback address; "::1" for IPv6
        std::string statePath;            // empty: state.json in a fresh temporary folder, removed
                                          // by the destructor (it outlives stop())
    };

    TimeServiceSim();
    explicit TimeServiceSim(Options options);
    ~TimeServiceSim();
    TimeServiceSim(const TimeServiceSim&) = delete;
    TimeServiceSim& operator=(const TimeServiceSim&) = delete;

    // "127.0.0.2:PORT" (with brackets around an IPv6 address).
    const std::string& host() const { return _host; }
    // "http://" + host() + path.
    std::string url(const std::string& path) const;
    // The resource name of a session on this service: "sync://" + host() + "/" + device.
    std::string resource(const std::string& device = "sync_1") const;
    const std::string& statePath() const { return _statePath; }
    pid_t pid() const { return _pid; }

    // Queues a directive for the next service requests, for example
    // {"count":2,"status":404}, {"delayMs":60000}, {"body":""}, {"wrapResult":true},
    // {"error":{"success":false,"errorCode":-123,"errorText":"t","errorInfo":"i"}},
    // {"repeat":1073741824,"body":"x"} (a body of 1 GiB, streamed, with its Content-Length),
    // {"repeat":3,"body":"abc","chunked":true} (streamed with chunked transfer encoding),
    // {"chunked":true} (the normal answer, streamed chunked).
    void next(const std::string& directiveJson);
    // Service requests answered so far.
    long served();
    // Service requests waiting in a delay now.
    long held();
    // Connections that carried a service request since the start or the last reset(); a kept-alive
    // connection that predates the reset counts again with its next service request. The test
    // controls' own connections do not count.
    long connections();
    // Bytes of streamed bodies ("repeat" or "chunked") that the server handed to the socket.
    long long streamed();
    // Streamed answers being sent now; 0 once every stream has ended, whole or cut off.
    long streaming();
    // The last service request as JSON: {"method","path","query","body","headers":{...}}; "{}" before any.
    std::string lastRequest();
    // Clears the directives, the counters (served, connections, streamed) and the last request.
    void reset();
    // Ends every delay that runs now.
    void release();
    // The state as JSON; replaceState sets it whole, mergeState merges objects member by member
    // (other values replace). Neither writes the state file.
    std::string state();
    void replaceState(const std::string& stateJson);
    void mergeState(const std::string& patchJson);

    // Sends SIGTERM and waits; returns the exit status (0 after a clean stop), or 128 + signal
    // when it was killed. Later calls return the same value.
    int stop();

private:
    std::string control(const char* method, const std::string& path, const std::string& body = {});
    long long stat(const char* name);  // one number of GET /_sim/stats
    void removeTemporaryFolder() noexcept;

    std::string _program;
    std::string _statePath;
    std::string _temporaryFolder;  // made by the constructor, removed by the destructor
    std::string _host;
    pid_t _pid = -1;
    int _exitStatus = -1;
};

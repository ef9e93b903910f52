// The simulator's shared state: the service's state, the queued directives, the counters and the
// last request. The service requests and the test controls work on it from many connection
// threads at once; every member function is safe to call from any of them.
#pragma once

#include "directive.h"
#include "state.h"
#include "stream.h"

#include <httplib.h>

#include <condition_variable>
#include <deque>
#include <mutex>
#include <string>

namespace timeservice {

class Simulator {
public:
    Simulator(std::string statePath, Json state);

    // Answers one request under /tiktalwebs, after the first queued directive's delay.
    void serve(const httplib::Request& req, httplib::Response& res);

    // The test controls.
    void queue(const Directive& directive);
    Json stats();
    Json lastRequest();
    void reset();
    void release();  // ends every delay that is running now
    Json state();
    // Replaces the state (`replace`) or merges `patch` into it; empty when it was taken, otherwise
    // what is wrong with the result (then the state stays as it was).
    std::string changeState(Json patch, bool replace);

    // Ends running delays and keeps new ones from waiting, so that the connections can be joined.
    void stop();

private:
    Directive takeDirective(const httplib::Request& req, const ServiceRequest& request);
    void hold(long long delayMs);

    std::mutex _mutex;
    std::condition_variable _wake;
    const std::string _statePath;
    Json _state;
    std::deque<Directive> _directives;
    long _served = 0;
    long _connections = 0;  // connections that carried a service request since the last reset
    unsigned _resets = 0;
    int _held = 0;
    unsigned _releases = 0;
    bool _stopping = false;
    Json _last;
    StreamCounters _streams;
};

}  // namespace timeservice

// Answer bodies that are produced while they are sent: a text repeated up to terabytes long, never
// built whole in memory.
#pragma once

#include <httplib.h>

#include <atomic>
#include <string>

namespace timeservice {

// What streamed bodies have done so far, for the test controls' stats.
struct StreamCounters {
    std::atomic<long long> bytes{0};  // body bytes handed to the socket
    std::atomic<long> running{0};     // streamed answers being sent now
};

// Makes `res` send `text` repeated `times` times as its body, with chunked transfer encoding or with
// its Content-Length. The body goes out piece by piece; a piece that the connection does not take
// (the client closed it) ends the answer and the connection.
void streamBody(httplib::Response& res, const std::string& text, long long times, bool chunked,
                StreamCounters& counters);

}  // namespace timeservice

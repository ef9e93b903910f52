// The connections of the server: each accepted one is served, all its requests in turn, by a thread
// of its own, and a stop ends the idle ones at once.
#pragma once

#include <httplib.h>

#include <atomic>
#include <functional>
#include <list>
#include <mutex>
#include <thread>

namespace timeservice {

// The server's task queue: every task is one accepted connection, which stays open as long as the
// client keeps it alive. A thread per connection, so that any number of kept-alive clients and
// delayed answers never make a new connection wait for a free worker.
class ConnectionThreads final : public httplib::TaskQueue {
public:
    ~ConnectionThreads() override { shutdown(); }

    void enqueue(std::function<void()> serveConnection) override;
    // Waits until every connection has ended.
    void shutdown() override;

private:
    struct Worker {
        std::thread thread;
        std::atomic<bool> done{false};
    };
    void joinFinished();  // with _mutex held

    std::mutex _mutex;
    std::list<Worker> _workers;
};

// True the first time it is called with `epoch` on the connection that the calling thread serves;
// false after that on the same connection, until `epoch` changes.
bool firstCallOnConnection(unsigned epoch);

// Shuts the receiving side of every connection accepted on local port `port`. The server's
// keep-alive loop waits for the client's next request for the whole keep-alive time and looks at
// a stop only between requests; a receiving side shut now reads as the client's end of stream, so
// each idle connection ends at once, while answers being written still go out.
void shutReceivingSides(int port);

}  // namespace timeservice

// The threads that serve the accepted connections, one each, and their sockets, so that a stop
// can shut every socket down and wait for every thread.
#pragma once

#include <functional>
#include <list>
#include <memory>
#include <mutex>
#include <thread>

namespace devd {

class Connections {
public:
    ~Connections();
    // Serves `fd` on a thread of its own with `serve`, then closes it. Joins the threads of
    // connections that have ended.
    void start(int fd, std::function<void(int fd)> serve);
    // Shuts down every open socket, which ends its connection, and joins every thread.
    void stopAll();

private:
    struct Connection {
        int fd = -1;
        bool done = false;  // guarded by _lock; set when fd is closed
        std::thread thread;
    };
    void joinEnded();

    std::mutex _lock;
    std::list<std::shared_ptr<Connection>> _open;
};

}  // namespace devd

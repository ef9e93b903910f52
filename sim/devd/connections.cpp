#include "connections.h"

#include <sys/socket.h>
#include <unistd.h>

#include <vector>

namespace devd {

Connections::~Connections() { stopAll(); }

void Connections::start(int fd, std::function<void(int fd)> serve) {
    joinEnded();
    auto connection = std::make_shared<Connection>();
    connection->fd = fd;
    std::lock_guard<std::mutex> guard(_lock);
    // The thread closes its socket under the lock, so stopAll never shuts down a descriptor that
    // was closed (and perhaps reused) meanwhile.
    connection->thread = std::thread([this, connection, serve = std::move(serve)] {
        serve(connection->fd);
        std::lock_guard<std::mutex> done(_lock);
        close(connection->fd);
        connection->done = true;
    });
    _open.push_back(std::move(connection));
}

void Connections::joinEnded() {
    std::vector<std::shared_ptr<Connection>> ended;
    {
        std::lock_guard<std::mutex> guard(_lock);
        for (auto it = _open.begin(); it != _open.end();) {
            if ((*it)->done) {
                ended.push_back(*it);
                it = _open.erase(it);
            } else {
                ++it;
            }
        }
    }
    for (auto& connection : ended) connection->thread.join();
}

void Connections::stopAll() {
    std::list<std::shared_ptr<Connection>> all;
    {
        std::lock_guard<std::mutex> guard(_lock);
        for (auto& connection : _open)
            if (!connection->done) shutdown(connection->fd, SHUT_RDWR);
        all.swap(_open);
    }
    for (auto& connection : all) connection->thread.join();
}

}  // namespace devd

// Requests to a device's driver: the device daemon's seqpacket socket.
#include "platform/platform.h"
#include "platform/unix/unix.h"

#include <sys/socket.h>
#include <sys/time.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <mutex>
#include <vector>

namespace platform {

namespace {

// How long a request waits for its answer; a driver that does not answer in this time has its
// connection closed, so that a late answer can never be taken for the next request's.
constexpr int kAnswerSeconds = 30;
constexpr std::size_t kHeaderSize = 8;

void putU32(std::uint8_t* at, std::uint32_t value) {
    for (int i = 0; i < 4; ++i) at[i] = static_cast<std::uint8_t>(value >> (8 * i));
}

std::uint32_t getU32(const std::uint8_t* at) {
    std::uint32_t value = 0;
    for (int i = 3; i >= 0; --i) value = (value << 8) | at[i];
    return value;
}

int connectTo(const std::string& path, int& error) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    if (path.empty() || path.size() >= sizeof address.sun_path) {
        error = path.empty() ? ENOENT : ENAMETOOLONG;
        return -1;
    }
    std::memcpy(address.sun_path, path.c_str(), path.size() + 1);
    const int socket = ::socket(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0);
    if (socket < 0) {
        error = errno;
        return -1;
    }
    // A driver that accepts nothing (stopped, its backlog full) would hold connect without end;
    // the send time limit bounds it, and then sending, as the answer limit bounds receiving.
    const timeval limit{kAnswerSeconds, 0};
    ::setsockopt(socket, SOL_SOCKET, SO_SNDTIMEO, &limit, sizeof limit);
    if (::connect(socket, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) {
        error = errno == EAGAIN ? ETIMEDOUT : errno;
        ::close(socket);
        return -1;
    }
    error = 0;
    return socket;
}

// Sends one request message; 0 or the error number. A peer that is gone is an error, not SIGPIPE.
int sendRequest(int socket, std::uint32_t code, const void* in, std::uint32_t inSize, std::uint32_t outSize) {
    std::vector<std::uint8_t> message(kHeaderSize + inSize);
    putU32(message.data(), code);
    putU32(message.data() + 4, outSize);
    if (inSize > 0) std::memcpy(message.data() + kHeaderSize, in, inSize);
    ssize_t sent;
    do sent = ::send(socket, message.data(), message.size(), MSG_NOSIGNAL);
    while (sent < 0 && errno == EINTR);
    if (sent < 0) return errno == EAGAIN || errno == EWOULDBLOCK ? ETIMEDOUT : errno;
    return static_cast<std::size_t>(sent) == message.size() ? 0 : EPROTO;
}

// Receives one answer message into `out`; 0 or the error number (the driver's or the transport's).
int receiveAnswer(int socket, void* out, std::uint32_t outSize, std::uint32_t& returned) {
    returned = 0;
    std::vector<std::uint8_t> message(kHeaderSize + outSize);
    ssize_t received;
    do received = ::recv(socket, message.data(), message.size(), MSG_TRUNC);
    while (received < 0 && errno == EINTR);
    if (received < 0) return errno == EAGAIN || errno == EWOULDBLOCK ? ETIMEDOUT : errno;
    if (received == 0) return ECONNRESET;  // the driver closed the connection
    return decodeDriverAnswer(message.data(), static_cast<std::size_t>(received), out, outSize, returned);
}

}  // namespace

int decodeDriverAnswer(const std::uint8_t* message, std::size_t received, void* out, std::uint32_t outSize,
                       std::uint32_t& returned) noexcept {
    returned = 0;
    if (received < kHeaderSize || received > kHeaderSize + outSize) return EPROTO;
    const std::uint32_t size = getU32(message + 4);
    if (size != received - kHeaderSize) return EPROTO;
    const std::int32_t error = static_cast<std::int32_t>(getU32(message));
    if (error < 0 || error > 4095) return EPROTO;
    // An answer is final: a driver that calls it pending has answered nothing that can be used.
    if (error == EAGAIN || error == EINPROGRESS) return EBADMSG;
    if (size > 0) std::memcpy(out, message + kHeaderSize, size);
    returned = size;
    return error;
}

struct DeviceChannel::State {
    int socket = -1;
    std::string path;
    std::mutex lock;  // one request and its answer at a time: answers come in order
};

DeviceChannel::DeviceChannel() : _state(std::make_unique<State>()) {}

DeviceChannel::~DeviceChannel() { close(); }

int DeviceChannel::open(const std::string& path) noexcept {
    std::lock_guard<std::mutex> hold(_state->lock);
    int error = 0;
    const int socket = connectTo(path, error);
    if (socket < 0) return error;
    const timeval limit{kAnswerSeconds, 0};
    ::setsockopt(socket, SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof limit);
    _state->socket = socket;
    _state->path = path;
    return 0;
}

void DeviceChannel::close() noexcept {
    std::lock_guard<std::mutex> hold(_state->lock);
    if (_state->socket >= 0) ::close(_state->socket);
    _state->socket = -1;
}

bool DeviceChannel::isOpen() const noexcept {
    std::lock_guard<std::mutex> hold(_state->lock);
    return _state->socket >= 0;
}

const std::string& DeviceChannel::path() const noexcept { return _state->path; }

int DeviceChannel::control(std::uint32_t code, const void* in, std::uint32_t inSize, void* out, std::uint32_t outSize,
                           std::uint32_t& returned) noexcept {
    returned = 0;
    std::lock_guard<std::mutex> hold(_state->lock);
    if (_state->socket < 0) return ENOTCONN;
    int error = sendRequest(_state->socket, code, in, inSize, outSize);
    if (error == 0) error = receiveAnswer(_state->socket, out, outSize, returned);
    // Lost step: the connection cannot tell later answers apart, so it ends here.
    if (error == ETIMEDOUT || error == EPROTO || error == ECONNRESET || error == EPIPE) {
        ::close(_state->socket);
        _state->socket = -1;
    }
    return error;
}

DeviceWait::~DeviceWait() {
    if (_socket >= 0) ::close(_socket);
}

int DeviceWait::arm(const std::string& path, std::uint32_t code, const void* in, std::uint32_t inSize,
                    std::uint64_t& identifier) noexcept {
    identifier = 0;
    abandon();
    if (_socket >= 0) ::close(_socket);
    int error = 0;
    _socket = connectTo(path, error);
    if (_socket < 0) return error;
    // The driver arms a wait at once; the end of the wait may take as long as it takes.
    timeval limit{kAnswerSeconds, 0};
    ::setsockopt(_socket, SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof limit);
    std::uint8_t armed[8] = {};
    std::uint32_t returned = 0;
    error = sendRequest(_socket, code, in, inSize, sizeof armed);
    if (error == 0) error = receiveAnswer(_socket, armed, sizeof armed, returned);
    if (error == 0 && returned != sizeof armed) error = EPROTO;
    if (error == 0) identifier = getU32(armed) | (static_cast<std::uint64_t>(getU32(armed + 4)) << 32);
    limit = timeval{0, 0};
    ::setsockopt(_socket, SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof limit);
    return error;
}

int DeviceWait::awaitEnd() noexcept {
    if (_socket < 0) return ENOTCONN;
    std::uint32_t returned = 0;
    return receiveAnswer(_socket, nullptr, 0, returned);
}

void DeviceWait::abandon() noexcept {
    if (_socket >= 0) ::shutdown(_socket, SHUT_RDWR);
}

}  // namespace platform

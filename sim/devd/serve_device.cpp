// One connection of the device socket: requests answered in order, one answer message each; a
// driver wait holds its connection until it ends.
#include "daemon.h"

#include <poll.h>
#include <sys/socket.h>

#include <cerrno>

namespace devd {
namespace {

// Room for one message: more than any request needs. A longer message is cut to this size by the
// socket, and refused all the same, as no request has an input of this size.
constexpr std::size_t kMessageRoom = 1024;

bool send(int fd, std::int32_t osError, const Bytes& output = {}) {
    const Bytes answer = encodeAnswer(osError, output);
    const ssize_t sent = ::send(fd, answer.data(), answer.size(), MSG_NOSIGNAL);
    return sent == static_cast<ssize_t>(answer.size());
}

// The "armed" answer of a wait: its identifier, 0 when it is not armed.
bool sendIdentifier(int fd, std::uint64_t id) {
    Bytes output(8);
    writeU64(output, 0, id);
    return send(fd, 0, output);
}

// True when the peer has closed its end, or this end was shut down for a stop.
bool hungUp(int fd) {
    pollfd state{fd, POLLRDHUP, 0};
    return poll(&state, 1, 0) == 1 && (state.revents & (POLLRDHUP | POLLHUP | POLLERR)) != 0;
}

// Receives one message; false at the end of the connection. A message of no bytes is one (and is
// refused) unless the peer has gone, since recv gives 0 for both.
bool receive(int fd, Bytes& message) {
    message.resize(kMessageRoom);
    for (;;) {
        const ssize_t got = recv(fd, message.data(), message.size(), 0);
        if (got < 0 && errno == EINTR) continue;
        if (got < 0 || (got == 0 && hungUp(fd))) return false;
        message.resize(static_cast<std::size_t>(got));
        return true;
    }
}

// Sleeps until the wait ends (true) or the connection hangs up (false).
bool awaitEnd(int fd, const Wait& wait) {
    for (;;) {
        pollfd watched[] = {{fd, POLLRDHUP, 0}, {wait.event(), POLLIN, 0}};
        if (poll(watched, 2, -1) < 0) {
            if (errno == EINTR) continue;
            return false;
        }
        if (watched[0].revents != 0) return false;
        if (watched[1].revents != 0) return true;
    }
}

// Arms a wait, answers its identifier, then answers again once it ends: OS error 0 when it was
// signalled, ECANCELED when it was cancelled. A driver-status directive leaves it unarmed.
bool answerWait(Daemon& daemon, int fd, const Request& request, bool refuse) {
    const std::shared_ptr<Wait> wait = refuse ? nullptr : daemon.waits.arm(request.input);
    if (!wait) return sendIdentifier(fd, 0);
    if (!sendIdentifier(fd, wait->id()) || !awaitEnd(fd, *wait)) {
        daemon.waits.forget(wait->id());
        return false;
    }
    return send(fd, wait->outcome() == Outcome::Signalled ? 0 : ECANCELED);
}

bool answerTable(Daemon& daemon, int fd, const Request& request, std::int32_t driverStatus, int osError) {
    if (driverStatus != 0) return send(fd, osError, failedOutput(request, driverStatus));
    const Bytes output = daemon.device.perform(request);
    if (request.code == kResetDeviceCode) daemon.waits.cancelAll();
    return send(fd, osError, output);
}

// Answers one message; false when the connection is to end.
bool handle(Daemon& daemon, int fd, const Bytes& message) {
    Decoded decoded = decode(message.data(), message.size());
    const Request& request = decoded.request;
    // Recorded after its directives are taken: a test that sees the request in the record knows
    // that the directives it set went to this one.
    const Action action = decoded.refusal == 0 ? daemon.directives.take(request.code) : Action{};
    if (decoded.hasHeader)
        daemon.record.add({request.code, request.outputSize, Bytes(message.begin() + kHeaderSize, message.end())});
    if (decoded.refusal != 0) return send(fd, decoded.refusal);

    if (action.close) return false;
    if (action.delayMs > 0 && !daemon.lifetime.sleepFor(action.delayMs)) return false;
    if (action.osError != 0 && !action.osErrorWithOutput) return send(fd, action.osError);
    switch (request.kind) {
        case Kind::Wait: return answerWait(daemon, fd, request, action.driverStatus != 0);
        case Kind::Cancel: {
            const bool cancelled = daemon.waits.end(readU32(request.input, 0), Outcome::Cancelled);
            return send(fd, cancelled ? 0 : ENOENT);
        }
        case Kind::Table: break;
    }
    return answerTable(daemon, fd, request, action.driverStatus, action.osError);
}

}  // namespace

void serveDevice(Daemon& daemon, int fd) {
    Bytes message;
    while (receive(fd, message) && handle(daemon, fd, message)) {
    }
}

}  // namespace devd

// Everything the connections of one daemon share: the device, its armed waits, the test
// directives, the record of requests, and whether the daemon is stopping.
#pragma once

#include "device.h"
#include "directives.h"
#include "record.h"
#include "waits.h"

#include <chrono>
#include <condition_variable>
#include <mutex>

namespace devd {

// Whether the daemon is stopping, and a sleep that a stop cuts short.
class Lifetime {
public:
    void stop();
    bool stopping() const;
    // Sleeps for `milliseconds`; false when the daemon began to stop meanwhile.
    bool sleepFor(int milliseconds);

private:
    mutable std::mutex _lock;
    std::condition_variable _changed;
    bool _stopping = false;
};

struct Daemon {
    Device device;
    Waits waits;
    Directives directives;
    Record record;
    Lifetime lifetime;
};

// Serves one connection of the device socket until the peer closes it, a directive closes it or
// the daemon stops (which shuts the socket down).
void serveDevice(Daemon& daemon, int fd);

// Serves one connection of the control socket: one JSON command per line, one JSON answer per
// line.
void serveControl(Daemon& daemon, int fd);

}  // namespace devd

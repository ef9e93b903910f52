// The driver waits that are armed now. A wait is armed by the connection that asked for it, which
// then sleeps on the wait's event descriptor (together with its socket) until a test control
// signals the wait, a cancel request or a device reset cancels it, or the caller goes away.
#pragma once

#include "wire.h"

#include <cstdint>
#include <map>
#include <memory>
#include <mutex>
#include <vector>

namespace devd {

enum class Outcome { Pending, Signalled, Cancelled };

// One armed wait: the arguments of its request and how it ended. `event` becomes readable once
// the outcome is no longer Pending.
class Wait {
public:
    Wait(std::uint64_t id, const Bytes& input);
    ~Wait();
    Wait(const Wait&) = delete;
    Wait& operator=(const Wait&) = delete;

    std::uint64_t id() const { return _id; }
    std::uint32_t arg2() const { return _arg2; }
    std::uint16_t arg1() const { return _arg1; }
    std::uint8_t arg3() const { return _arg3; }
    int event() const { return _event; }
    Outcome outcome() const;
    // Sets the outcome and wakes the connection that waits.
    void end(Outcome outcome);

private:
    const std::uint64_t _id;
    const std::uint32_t _arg2;
    const std::uint16_t _arg1;
    const std::uint8_t _arg3;
    const int _event;  // an eventfd
    mutable std::mutex _lock;
    Outcome _outcome = Outcome::Pending;
};

class Waits {
public:
    // Arms a wait for the 24-byte wait packet; null when it cannot be armed (no event descriptor).
    // Identifiers count up from 1 and fit in 32 bits, as the cancel packet carries 32 of them.
    std::shared_ptr<Wait> arm(const Bytes& input);
    // Ends the armed wait `id` with `outcome`; false when no wait of that identifier is armed.
    bool end(std::uint64_t id, Outcome outcome);
    // Cancels every armed wait (a device reset).
    void cancelAll();
    // Forgets a wait without answering it: its caller has gone away.
    void forget(std::uint64_t id);
    // The armed waits, by identifier.
    std::vector<std::shared_ptr<Wait>> armed() const;

private:
    mutable std::mutex _lock;
    std::map<std::uint64_t, std::shared_ptr<Wait>> _armed;
    std::uint32_t _lastId = 0;
};

}  // namespace devd

#include "waits.h"

#include <sys/eventfd.h>
#include <unistd.h>

namespace devd {

// The wait packet: identifier cell address (u64), event handle (u64), arg2 (u32), arg1 (u16),
// arg3 (u8), one pad byte. The first two belong to the caller's process and mean nothing here.
Wait::Wait(std::uint64_t id, const Bytes& input)
    : _id(id),
      _arg2(readU32(input, 16)),
      _arg1(static_cast<std::uint16_t>(readU32(input, 20))),
      _arg3(static_cast<std::uint8_t>(readU32(input, 20) >> 16)),
      _event(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {}

Wait::~Wait() {
    if (_event >= 0) close(_event);
}

Outcome Wait::outcome() const {
    std::lock_guard<std::mutex> guard(_lock);
    return _outcome;
}

void Wait::end(Outcome outcome) {
    std::lock_guard<std::mutex> guard(_lock);
    if (_outcome != Outcome::Pending) return;
    _outcome = outcome;
    const std::uint64_t one = 1;
    [[maybe_unused]] const ssize_t written = write(_event, &one, sizeof one);
}

std::shared_ptr<Wait> Waits::arm(const Bytes& input) {
    std::lock_guard<std::mutex> guard(_lock);
    if (++_lastId == 0) _lastId = 1;
    auto wait = std::make_shared<Wait>(_lastId, input);
    if (wait->event() < 0) return nullptr;
    _armed[wait->id()] = wait;
    return wait;
}

bool Waits::end(std::uint64_t id, Outcome outcome) {
    std::shared_ptr<Wait> wait;
    {
        std::lock_guard<std::mutex> guard(_lock);
        const auto found = _armed.find(id);
        if (found == _armed.end()) return false;
        wait = found->second;
        _armed.erase(found);
    }
    wait->end(outcome);
    return true;
}

void Waits::cancelAll() {
    std::map<std::uint64_t, std::shared_ptr<Wait>> armed;
    {
        std::lock_guard<std::mutex> guard(_lock);
        armed.swap(_armed);
    }
    for (auto& entry : armed) entry.second->end(Outcome::Cancelled);
}

void Waits::forget(std::uint64_t id) {
    std::lock_guard<std::mutex> guard(_lock);
    _armed.erase(id);
}

std::vector<std::shared_ptr<Wait>> Waits::armed() const {
    std::lock_guard<std::mutex> guard(_lock);
    std::vector<std::shared_ptr<Wait>> waits;
    for (const auto& entry : _armed) waits.push_back(entry.second);
    return waits;
}

}  // namespace devd

#include "directives.h"

namespace devd {
namespace {

// The value of a pending directive when it still has requests to go, else the default value.
template <typename Value, typename PendingValue>
Value use(PendingValue& pending) {
    if (pending.count <= 0) return Value{};
    --pending.count;
    return pending.value;
}

}  // namespace

void Directives::failNext(std::uint32_t code, std::int32_t driverStatus, int count) {
    std::lock_guard<std::mutex> guard(_lock);
    _codes[code].driverStatus = {driverStatus, count};
}

void Directives::failSystemCall(std::uint32_t code, int osError, int count, bool withOutput) {
    std::lock_guard<std::mutex> guard(_lock);
    _codes[code].osError = {osError, count};
    _codes[code].osErrorWithOutput = withOutput;
}

void Directives::delayNext(std::uint32_t code, int milliseconds, int count) {
    std::lock_guard<std::mutex> guard(_lock);
    _codes[code].delayMs = {milliseconds, count};
}

void Directives::closeOnNext(std::uint32_t code, int count) {
    std::lock_guard<std::mutex> guard(_lock);
    _codes[code].close = {true, count};
}

Action Directives::take(std::uint32_t code) {
    std::lock_guard<std::mutex> guard(_lock);
    const auto found = _codes.find(code);
    if (found == _codes.end()) return {};
    ForCode& pending = found->second;
    Action action;
    action.close = use<bool>(pending.close);
    action.delayMs = use<int>(pending.delayMs);
    action.osError = use<int>(pending.osError);
    action.osErrorWithOutput = action.osError != 0 && pending.osErrorWithOutput;
    action.driverStatus = use<std::int32_t>(pending.driverStatus);
    return action;
}

}  // namespace devd

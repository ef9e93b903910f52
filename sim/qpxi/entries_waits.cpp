// Entry points: waiting for a session to be invalidated, and ending such waits.
#include "frame.h"

using namespace qpxisim;

int32_t zrqpxi_waitForSessionInvalidation(uint32_t session, uint32_t timeoutInMs, zrqpxi_Status* st) {
    return run("waitForSessionInvalidation", {session, timeoutInMs}, st,
               [=](State& s, std::unique_lock<std::mutex>& lock) {
                   return s.waitForInvalidation(lock, session, timeoutInMs);
               });
}

int32_t zrqpxi_cancelWaitForInvalidation(uint32_t session) {
    // There is no record: an unknown session answers its code instead.
    int32_t refused = 0;
    const int32_t ended = run("cancelWaitForInvalidation", {session}, nullptr, [&](State& s) {
        try {
            return s.cancelWaits(session);
        } catch (const Failure& failure) {
            refused = failure.code;
            return int32_t{0};
        }
    });
    return refused ? refused : ended;
}

// The frame every entry point runs in: the call is logged with its numeric arguments, its work
// runs on the state under the state's lock, and a refusal is written into the caller's status
// record after the lock is released (the caller's reallocate never runs under it). Nothing is
// thrown out of it.
#pragma once

#include "state.h"
#include "status.h"
#include "status_record.h"

#include <cstdint>
#include <initializer_list>
#include <mutex>
#include <new>
#include <string>
#include <type_traits>
#include <utility>

namespace qpxisim {

// "name(1,2)": one line of the log of calls.
std::string logLine(const char* function, std::initializer_list<std::uint64_t> args);

// Calls `work` with the state, and the held lock when it takes one.
template <class Work>
decltype(auto) invoke(Work& work, State& s, std::unique_lock<std::mutex>& lock) {
    if constexpr (std::is_invocable_v<Work&, State&>)
        return work(s);
    else
        return work(s, lock);
}

// Runs `work` with the state (and, when it takes one, the held lock) as the entry point
// `function`; a refusal sets the record's code and details and makes the result zero.
template <class Work>
auto run(const char* function, std::initializer_list<std::uint64_t> args, zrqpxi_Status* st, Work&& work) noexcept {
    using Lock = std::unique_lock<std::mutex>;
    using Result = decltype(invoke(work, state(), std::declval<Lock&>()));
    std::conditional_t<std::is_void_v<Result>, int, Result> result{};
    Failure failure{0, {}, {}, {}};
    {
        Lock lock(stateLock());
        try {
            state().logCall(logLine(function, args));
            if constexpr (std::is_void_v<Result>)
                invoke(work, state(), lock);
            else
                result = invoke(work, state(), lock);
        } catch (Failure& refused) {
            failure = std::move(refused);
            result = {};
        } catch (const std::bad_alloc&) {
            failure = Failure{code::kOutOfResources, "out of memory", {}, {}};
            result = {};
        }
    }
    if (failure.code) {
        std::string json;
        try {
            json = details((std::string("zrqpxi_") + function).c_str(), failure);
        } catch (const std::bad_alloc&) {
            json = "{}";
        }
        simcommon::writeStatus(st, failure.code, json);
    }
    if constexpr (!std::is_void_v<Result>) return result;
}

}  // namespace qpxisim

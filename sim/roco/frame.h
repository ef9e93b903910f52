// The frame every entry point runs in: the call's name and arguments for the log, the service's
// lock around the work, and a refusal written into the caller's status record after the lock is
// released (the caller's reallocate never runs under it). Nothing is thrown out of it.
#pragma once

#include "json.h"
#include "state.h"
#include "status.h"

#include <cstdint>
#include <mutex>
#include <new>
#include <type_traits>

namespace rocosim {

class Call {
public:
    explicit Call(const char* function) noexcept;
    Call& arg(const char* key, const char* text) noexcept;  // null is logged as null
    Call& arg(const char* key, std::int64_t number) noexcept;
    Call& given(const char* key, const void* pointer) noexcept;  // logged: whether it is null

    // Runs `work` on the service under its lock and logs the call; a refusal sets the record's
    // code and details and makes the result zero (or null).
    template <class Work>
    auto run(zrrocoapi_Status* st, Work&& work) noexcept {
        using Result = decltype(work(service()));
        std::conditional_t<std::is_void_v<Result>, int, Result> result{};
        std::int32_t status = 0;
        std::string details;
        {
            std::lock_guard<std::mutex> lock(serviceLock());
            try {
                if constexpr (std::is_void_v<Result>)
                    work(service());
                else
                    result = work(service());
            } catch (const Failure& failure) {
                status = refuse(failure, details);
            } catch (const std::exception& error) {
                status = refuse({code::kInvalidArgument, error.what(), {}}, details);
            }
            if constexpr (std::is_integral_v<Result>) logResult(result);
            record(status);
        }
        if (status) report(st, status, details);
        if constexpr (!std::is_void_v<Result>) return result;
    }

private:
    std::int32_t refuse(const Failure& failure, std::string& details) noexcept;
    void logResult(std::int64_t result) noexcept;
    void record(std::int32_t status) noexcept;

    const char* _function;
    Json _entry;
    cJSON* _args = nullptr;
};

}  // namespace rocosim

// What the test controls ask of the next requests of a control code: fail them with a driver
// status, fail them at the system-call level, delay them, or close the connection on them. Each
// directive lasts for a number of requests; a new one of the same kind for the same code replaces
// the old. Only requests that decode take directives; a refused message leaves them in place.
#pragma once

#include <cstdint>
#include <map>
#include <mutex>

namespace devd {

// What the daemon does with one request, beyond carrying it out.
struct Action {
    bool close = false;           // read the request, then close the connection without answering
    int delayMs = 0;              // wait this long before answering
    int osError = 0;              // answer this OS error with no output, the request not carried out
    bool osErrorWithOutput = false;  // ... unless this: carried out, its output beside the error
    std::int32_t driverStatus = 0;  // answer this driver status, the request not carried out
};

class Directives {
public:
    void failNext(std::uint32_t code, std::int32_t driverStatus, int count);
    void failSystemCall(std::uint32_t code, int osError, int count, bool withOutput = false);
    void delayNext(std::uint32_t code, int milliseconds, int count);
    void closeOnNext(std::uint32_t code, int count);

    // Takes one request's share of every directive of `code`.
    Action take(std::uint32_t code);

private:
    template <typename Value>
    struct Pending {
        Value value{};
        int count = 0;
    };
    struct ForCode {
        Pending<std::int32_t> driverStatus;
        Pending<int> osError;
        bool osErrorWithOutput = false;
        Pending<int> delayMs;
        Pending<bool> close;
    };

    std::mutex _lock;
    std::map<std::uint32_t, ForCode> _codes;
};

}  // namespace devd

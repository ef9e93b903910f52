// The two ways a command fails: a usage error (exit status 2) is found before anything is sent;
// a status error (exit status 1) is a call of the C interface that returned a status other than 0.
#pragma once

#include <stdexcept>
#include <string>

#include <tiktal/tiktal.h>

namespace cli {

struct UsageError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

struct StatusError {
    std::string function;
    ViStatus status;
};

// Throws a StatusError unless `status` is 0.
inline void check(const char* function, ViStatus status) {
    if (status != VI_SUCCESS) throw StatusError{function, status};
}

// A size query: its positive (or zero) result is the size, a negative one an error.
inline ViInt32 checkSize(const char* function, ViStatus status) {
    if (status < 0) throw StatusError{function, status};
    return status;
}

}  // namespace cli

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

// A size query: its positive (or zero) result is the size, a negative one an error. A status the
// library knows (tiktal_error_message finds its text) is a warning, not a size: taking the 202
// warning 0x3FFA4064 for a size would ask for a buffer of a gigabyte.
inline ViInt32 checkSize(const char* function, ViStatus status) {
    ViChar message[TIKTAL_ERROR_MESSAGE_SIZE];
    if (status < 0 || (status > 0 && tiktal_error_message(VI_NULL, status, message) == VI_SUCCESS))
        throw StatusError{function, status};
    return status;
}

}  // namespace cli

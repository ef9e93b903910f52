// Error numbers and the platform statuses they stand for.
#include "platform/platform.h"
#include "platform/unix/unix.h"

#include <cerrno>
#include <cstring>

namespace platform {

// Operating-system errors and the platform statuses they stand for; the Windows errors of the same
// meaning, which the statuses were first defined for, are named beside each row.
namespace {

struct OsErrorRow {
    int error;
    std::int32_t status;
};

constexpr OsErrorRow kOsErrors[] = {
    {EINPROGRESS, 52011}, {EAGAIN, 52011},                              // 997 I/O pending (a warning)
    {ENOMEM, -52000},     {ENOBUFS, -52000},                            // 8, 1450 no memory or resources
    {EOPNOTSUPP, -52002}, {ENOSYS, -52002},   {ENOTTY, -52002},         // 50, 1 not supported
    {ECONNRESET, -52003}, {EPIPE, -52003},    {EIO, -52003},            // 31, 1117 the device does not function
    {ENOTCONN, -52003},
    {EINVAL, -52005},     {ENAMETOOLONG, -52005},                       // 87 invalid parameter
    {ENOENT, -52006},     {ENODEV, -52006},   {ENXIO, -52006},          // 2 no such device
    {ECONNREFUSED, -52006},                                             //   (no driver behind the path)
    {ETIMEDOUT, -52007},                                                // 121, 258 time-out
    {EPROTO, -52008},     {EBADMSG, -52008},                            // 1359 internal error (a malformed answer)
    {EACCES, -52009},     {EPERM, -52009},                              // 5 access denied
    {ENODATA, -52012},                                                  // 38 end of data
    {EEXIST, -52013},                                                   // 183 already exists
    {EMSGSIZE, -52019},   {EOVERFLOW, -52019},                          // 122 buffer too small
    {EBUSY, -52031},                                                    // 170 busy
};

// An error not in the table: the device does not function.
constexpr std::int32_t kUnknownOsError = -52003;

}  // namespace

std::int32_t statusOfOsError(int error) noexcept {
    if (error == 0) return 0;
    for (const OsErrorRow& row : kOsErrors)
        if (row.error == error) return row.status;
    return kUnknownOsError;
}

std::string osErrorText(int error) {
    char buffer[256];
    // The GNU strerror_r returns the text, which may or may not be in the buffer.
    return strerror_r(error, buffer, sizeof buffer);
}

}  // namespace platform

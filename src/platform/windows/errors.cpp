// System error codes and the platform statuses they stand for.
#include "platform/platform.h"
#include "platform/windows/windows.h"

namespace platform {
namespace {

struct OsErrorRow {
    DWORD error;
    std::int32_t status;
};

// The rows the Unix backend's table mirrors with errno values.
constexpr OsErrorRow kOsErrors[] = {
    {ERROR_IO_PENDING, 52011},                                                 // a warning
    {ERROR_NOT_ENOUGH_MEMORY, -52000}, {ERROR_NO_SYSTEM_RESOURCES, -52000},
    {ERROR_NOT_SUPPORTED, -52002},     {ERROR_INVALID_FUNCTION, -52002},
    {ERROR_GEN_FAILURE, -52003},       {ERROR_IO_DEVICE, -52003},              // the device does not function
    {ERROR_INVALID_PARAMETER, -52005},
    {ERROR_FILE_NOT_FOUND, -52006},                                            // no such device
    {ERROR_SEM_TIMEOUT, -52007},       {WAIT_TIMEOUT, -52007},
    {ERROR_INTERNAL_ERROR, -52008},
    {ERROR_ACCESS_DENIED, -52009},
    {ERROR_HANDLE_EOF, -52012},
    {ERROR_ALREADY_EXISTS, -52013},
    {ERROR_INSUFFICIENT_BUFFER, -52019},
    {ERROR_BUSY, -52031},
};

// An error not in the table: the device does not function.
constexpr std::int32_t kUnknownOsError = -52003;

}  // namespace

std::int32_t statusOfOsError(int error) noexcept {
    if (error == 0) return 0;
    for (const OsErrorRow& row : kOsErrors)
        if (row.error == static_cast<DWORD>(error)) return row.status;
    return kUnknownOsError;
}

std::string osErrorText(int error) {
    char buffer[512];
    const DWORD length = FormatMessageA(FORMAT_MESSAGE_FROM_SYSTEM | FORMAT_MESSAGE_IGNORE_INSERTS, nullptr,
                                        static_cast<DWORD>(error), 0, buffer, sizeof buffer, nullptr);
    std::string text(buffer, length);
    while (!text.empty() && (text.back() == '\n' || text.back() == '\r' || text.back() == ' ')) text.pop_back();
    return text.empty() ? "System error " + std::to_string(error) : text;
}

std::string lastErrorText() { return osErrorText(static_cast<int>(GetLastError())); }

}  // namespace platform

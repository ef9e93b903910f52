// What the Windows backend's files share among themselves.
#pragma once

#ifndef WIN32_LEAN_AND_MEAN
#define WIN32_LEAN_AND_MEAN
#endif
#ifndef NOMINMAX
#define NOMINMAX
#endif
#include <windows.h>

#include <cstddef>
#include <string>
#include <vector>

namespace platform {

// The message text of the calling thread's last error, for the details of a failure.
std::string lastErrorText();

// The whole content of an open file from its start; a file longer than `limit` bytes is not
// read: ERROR_FILE_TOO_LARGE, nothing kept. 0 or the error code.
int readWhole(HANDLE file, std::size_t limit, std::string& text);

// Windows handles of kernel objects fit in 32 bits, in 64-bit processes too (so that 32-bit and
// 64-bit processes can share them); the platform layer keeps a file's handle where Unix keeps its
// descriptor.
inline HANDLE handleOf(int descriptor) { return reinterpret_cast<HANDLE>(static_cast<INT_PTR>(descriptor)); }
inline int descriptorOf(HANDLE handle) { return static_cast<int>(reinterpret_cast<INT_PTR>(handle)); }

}  // namespace platform

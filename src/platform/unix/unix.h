// What the Unix backend's files share among themselves.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

namespace platform {

// The root of the machine the library sees: $TIKTAL_SYSROOT, empty on a real machine.
std::string sysroot();
// The whole content of an open file from its start; a file longer than `limit` bytes is not
// read: EFBIG, nothing kept. 0 or the error number.
int readWhole(int descriptor, std::size_t limit, std::string& text);

}  // namespace platform

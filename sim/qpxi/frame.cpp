#include "frame.h"

namespace qpxisim {

std::string logLine(const char* function, std::initializer_list<std::uint64_t> args) {
    std::string line = std::string(function) + "(";
    for (const std::uint64_t arg : args) line += (line.back() == '(' ? "" : ",") + std::to_string(arg);
    return line + ")";
}

}  // namespace qpxisim

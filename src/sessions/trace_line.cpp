#include "sessions/trace_line.h"

#include "platform/platform.h"

#include <cstdarg>
#include <cstdio>
#include <cstring>

namespace {

constexpr std::size_t kLineSize = 512;

// Right-aligns `text` in `width` characters, keeping its last characters when it is longer.
char* putAligned(char* out, const char* text, std::size_t width) {
    const std::size_t length = std::strlen(text);
    if (length >= width) {
        std::memcpy(out, text + length - width, width);
    } else {
        std::memset(out, ' ', width - length);
        std::memcpy(out + width - length, text, length);
    }
    return out + width;
}

}  // namespace

void zrsdbg_VarLine::printf(const char* format, ...) noexcept {
    char buffer[kLineSize];
    char* p = buffer;
    *p++ = '[';
    p = putAligned(p, _component, 10);
    *p++ = '|';
    p = putAligned(p, _file, 32);
    *p++ = '|';
    char digits[16];
    std::snprintf(digits, sizeof digits, "%04u", static_cast<unsigned>(_line) % 10000);
    p = putAligned(p, digits, 4);
    *p++ = ']';
    *p++ = ' ';

    const std::size_t terminator = std::strlen(_terminator);
    const std::size_t room = kLineSize - static_cast<std::size_t>(p - buffer) - terminator;
    va_list args;
    va_start(args, format);
    const int wanted = std::vsnprintf(p, room, format, args);
    va_end(args);
    if (wanted > 0) p += static_cast<std::size_t>(wanted) < room ? wanted : room - 1;
    std::memcpy(p, _terminator, terminator);
    p += terminator;
    platform::writeDebugOutput(buffer, static_cast<std::size_t>(p - buffer));
}

zrsdbg_ScopeLine::zrsdbg_ScopeLine(const char* file, int line, const char* name) noexcept
    : _file(file), _line(line), _name(name) {
    zrsdbg_VarLine opening(_file, _line, "{ ");
    opening.printf("%s%s%s", opening.prefix(), _name, opening.suffix());
}

zrsdbg_ScopeLine::~zrsdbg_ScopeLine() {
    const bool unwinding = std::uncaught_exceptions() > _exceptions;
    zrsdbg_VarLine closing(_file, _line, unwinding ? "} (uncaught_exception) " : "} ");
    closing.printf("%s%s%s", closing.prefix(), _name, closing.suffix());
}

// The debug output (OutputDebugStringA) and the fatal end of the process (a message box).
#include "platform/platform.h"
#include "platform/windows/windows.h"

#include <cstring>
#include <string>

namespace platform {

// OutputDebugStringA takes a NUL-terminated text and hands it to a debugger whole.
void writeDebugOutput(const char* line, std::size_t length) noexcept {
    char shortLine[512];
    if (length < sizeof shortLine) {
        std::memcpy(shortLine, line, length);
        shortLine[length] = '\0';
        OutputDebugStringA(shortLine);
        return;
    }
    try {
        OutputDebugStringA(std::string(line, length).c_str());
    } catch (...) {
        // No memory for a copy: the line is lost, as a full pipe would lose it.
    }
}

void fatalError(const std::string& text) noexcept {
    MessageBoxA(nullptr, text.c_str(), "Fatal Error", MB_OK | MB_ICONERROR | MB_TASKMODAL);
    // The process is in no state to run its detach routines.
    TerminateProcess(GetCurrentProcess(), 1);
    ExitProcess(1);
}

}  // namespace platform

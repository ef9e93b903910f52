// The trace of the call-tracing session as a debugger reads it: trace_child.exe runs under this
// program as its debugger, and every OUTPUT_DEBUG_STRING_EVENT is one line read from the child's
// memory. The lines are those the trace tests of other systems read from standard error.
#ifndef WIN32_LEAN_AND_MEAN
#define WIN32_LEAN_AND_MEAN
#endif
#include <windows.h>

#include "capi_support.h"

namespace {

using namespace capi;

struct Debugged {
    std::vector<std::string> lines;  // the debug output, one string per event
    DWORD exitCode = ~0u;
};

// Starts `commandLine` as a debugged child and serves its debug events until it exits.
Debugged debug(std::string commandLine) {
    Debugged result;
    STARTUPINFOA startup{};
    startup.cb = sizeof startup;
    PROCESS_INFORMATION child{};
    if (!CreateProcessA(nullptr, commandLine.data(), nullptr, nullptr, FALSE, DEBUG_ONLY_THIS_PROCESS, nullptr,
                        nullptr, &startup, &child)) {
        ADD_FAILURE() << "CreateProcessA: error " << GetLastError();
        return result;
    }
    for (bool running = true; running;) {
        DEBUG_EVENT event{};
        if (!WaitForDebugEvent(&event, 60000)) {
            ADD_FAILURE() << "WaitForDebugEvent: error " << GetLastError();
            TerminateProcess(child.hProcess, 99);
            break;
        }
        DWORD continueStatus = DBG_CONTINUE;
        switch (event.dwDebugEventCode) {
        case OUTPUT_DEBUG_STRING_EVENT: {
            const OUTPUT_DEBUG_STRING_INFO& text = event.u.DebugString;
            EXPECT_FALSE(text.fUnicode);
            std::string line(text.nDebugStringLength, '\0');
            SIZE_T read = 0;
            EXPECT_TRUE(ReadProcessMemory(child.hProcess, text.lpDebugStringData, line.data(), line.size(), &read));
            line.resize(read);
            if (!line.empty() && line.back() == '\0') line.pop_back();
            result.lines.push_back(line);
            break;
        }
        case EXCEPTION_DEBUG_EVENT:  // the loader's breakpoint is ours; the child handles the rest
            if (event.u.Exception.ExceptionRecord.ExceptionCode != EXCEPTION_BREAKPOINT)
                continueStatus = DBG_EXCEPTION_NOT_HANDLED;
            break;
        case CREATE_PROCESS_DEBUG_EVENT:
            if (event.u.CreateProcessInfo.hFile) CloseHandle(event.u.CreateProcessInfo.hFile);
            break;
        case LOAD_DLL_DEBUG_EVENT:
            if (event.u.LoadDll.hFile) CloseHandle(event.u.LoadDll.hFile);
            break;
        case EXIT_PROCESS_DEBUG_EVENT:
            result.exitCode = event.u.ExitProcess.dwExitCode;
            running = false;
            break;
        }
        ContinueDebugEvent(event.dwProcessId, event.dwThreadId, continueStatus);
    }
    CloseHandle(child.hThread);
    CloseHandle(child.hProcess);
    return result;
}

std::string besideThisProgram(const char* name) {
    char path[MAX_PATH];
    const DWORD length = GetModuleFileNameA(nullptr, path, MAX_PATH);
    std::string folder(path, length);
    return folder.substr(0, folder.find_last_of('\\') + 1) + name;
}

std::vector<std::string> scope(const std::string& operation, std::vector<std::string> parameters = {}) {
    parameters.insert(parameters.begin(), "{ " + kTraced + operation);
    parameters.push_back("} " + kTraced + operation);
    return parameters;
}

TEST(TraceUnderADebugger, EveryCallAndParameterIsOneWholeLine) {
    const Debugged child = debug('"' + besideThisProgram("win_trace_child.exe") + '"');
    EXPECT_EQ(child.exitCode, 0u);
    std::vector<std::string> expected;
    for (const auto& lines : {
             scope("SessionDebugPrintOnly"),
             scope("reset"),
             scope("connectTrigTerminals", {"srcTerminal: PXI_Trig0", "destTerminal: PFI0", "syncClock: (null)",
                                            "invert: -1", "updateEdge: 2"}),
             scope("adjustTimeBeta", {"timeReferenceNanos: 18446744073709551615", "timeKeeperNanos: 0"}),
             scope("createFutureTimeEvent", {"terminal: PFI1", "outputLevel: -2147483648", "timeSeconds: 4294967295",
                                             "timeNanoseconds: 0", "timeFractionalNanoseconds: 65535"}),
             scope("setAttributeViReal64", {"terminalName: ", "attribute: 1150100", "value: -0.25"}),
             scope("setAttributeViBoolean", {"terminalName: GPS", "attribute: 1150812", "value: 1"}),
             scope("clearClock", {"terminal: A..."}),
             scope("~SessionDebugPrintOnly"),
         })
        expected.insert(expected.end(), lines.begin(), lines.end());
    std::vector<std::string> messages = traceMessages(child.lines);
    for (std::string& message : messages)  // the long text, cut to the room of one line
        if (message.rfind("terminal: A", 0) == 0 && message.find_first_not_of('A', 10) == std::string::npos)
            message = "terminal: A...";
    EXPECT_EQ(messages, expected);
    for (const std::string& line : child.lines) EXPECT_LT(line.size(), 512u);
}

}  // namespace

// Capture of the trace for tests on Windows, where the library hands its lines to the debug
// output (OutputDebugStringA) instead of standard error. OutputDebugStringA raises the exception
// DBG_PRINTEXCEPTION_C with the text; in a process without a debugger a vectored handler sees it
// first, so the test collects each line whole, in the order the calls made them.
#pragma once

#ifndef WIN32_LEAN_AND_MEAN
#define WIN32_LEAN_AND_MEAN
#endif
#include <windows.h>

#include <atomic>
#include <cstring>
#include <functional>
#include <mutex>
#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

namespace testsupport {

// The debug output takes a line of any length whole; the library's lines are at most this long.
inline constexpr std::size_t kWholeWriteLimit = 512;

// Calls `onLine` with every text handed to the debug output, on the thread that hands it over,
// while alive; the text then goes no further.
class DebugOutputHook {
public:
    explicit DebugOutputHook(std::function<void(std::string)> onLine) : _onLine(std::move(onLine)) {
        std::lock_guard<std::mutex> hold(lock());
        if (current()) throw std::logic_error("one debug-output hook at a time");
        current() = this;
        _handler = AddVectoredExceptionHandler(1, &handle);
    }
    ~DebugOutputHook() {
        {
            std::lock_guard<std::mutex> hold(lock());
            current() = nullptr;
        }
        while (_calls.load() > 0) Sleep(1);  // lines being handed over still use this hook
        RemoveVectoredExceptionHandler(_handler);
    }
    DebugOutputHook(const DebugOutputHook&) = delete;
    DebugOutputHook& operator=(const DebugOutputHook&) = delete;

private:
    static std::mutex& lock() {
        static std::mutex m;
        return m;
    }
    static DebugOutputHook*& current() {
        static DebugOutputHook* hook = nullptr;
        return hook;
    }
    // ExceptionInformation: [0] the length with the NUL, [1] the text.
    static LONG CALLBACK handle(EXCEPTION_POINTERS* exception) {
        const EXCEPTION_RECORD* record = exception->ExceptionRecord;
        if (record->ExceptionCode != DBG_PRINTEXCEPTION_C || record->NumberParameters < 2) return EXCEPTION_CONTINUE_SEARCH;
        const auto* text = reinterpret_cast<const char*>(record->ExceptionInformation[1]);
        const std::size_t length = record->ExceptionInformation[0] ? record->ExceptionInformation[0] - 1 : 0;
        DebugOutputHook* hook;
        {
            std::lock_guard<std::mutex> hold(lock());
            hook = current();
            if (hook) ++hook->_calls;
        }
        if (hook) {
            hook->_onLine(std::string(text, strnlen(text, length)));
            --hook->_calls;
        }
        return EXCEPTION_CONTINUE_EXECUTION;
    }

    std::function<void(std::string)> _onLine;
    std::atomic<int> _calls{0};
    void* _handler = nullptr;
};

// Nothing reaches standard error on Windows: the trace goes to the debug output, which shows
// nothing without a debugger.
class QuietStderr {
public:
    QuietStderr() {}
    ~QuietStderr() {}
};

// Collects the lines handed to the debug output, one string per line.
class StderrCapture {
public:
    StderrCapture() : _hook(std::in_place, [this](std::string line) {
        std::lock_guard<std::mutex> hold(_mutex);
        _writes.push_back(std::move(line));
    }) {}

    // Ends the capture and returns the lines handed over since it began.
    std::vector<std::string> finish() {
        _hook.reset();
        std::lock_guard<std::mutex> hold(_mutex);
        return std::move(_writes);
    }

private:
    std::mutex _mutex;
    std::vector<std::string> _writes;
    std::optional<DebugOutputHook> _hook;
};

}  // namespace testsupport

// Holds a thread inside the library while it writes its trace (Windows): every line handed to the
// debug output after the first waits, on the thread that hands it over, until the hold ends.
#pragma once

#include <chrono>
#include <condition_variable>
#include <future>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "stderr_capture.h"

namespace testsupport {

// Runs `blocked` on a thread of its own until it hands its second trace line to the debug output:
// the thread is then inside the library, held in that call. Then `meanwhile` runs (on another
// thread, given up after 10 s), and afterwards the held lines go on. Returns the trace lines that
// `blocked` and `meanwhile` wrote, in order. (`firstLineSize` serves the pipe of other systems.)
template <class Blocked, class Meanwhile>
std::vector<std::string> whileBlockedInTrace(std::size_t /*firstLineSize*/, Blocked&& blocked, Meanwhile&& meanwhile) {
    using namespace std::chrono_literals;
    std::mutex mutex;
    std::condition_variable changed;
    std::vector<std::string> lines;
    bool held = false, released = false;
    std::optional<DebugOutputHook> hook(std::in_place, [&](std::string line) {
        std::unique_lock<std::mutex> hold(mutex);
        if (!lines.empty()) {
            held = true;
            changed.notify_all();
            changed.wait(hold, [&] { return released; });
        }
        lines.push_back(std::move(line));
    });

    std::thread thread(blocked);
    std::future<void> other;
    bool arrived;
    {
        std::unique_lock<std::mutex> hold(mutex);
        arrived = changed.wait_for(hold, 10s, [&] { return held; });
    }
    if (!arrived) {
        ADD_FAILURE() << "the second trace line never came";
    } else {
        other = std::async(std::launch::async, meanwhile);
        if (other.wait_for(10s) != std::future_status::ready)
            ADD_FAILURE() << "the calls made meanwhile waited for the blocked thread";
    }
    {
        std::lock_guard<std::mutex> hold(mutex);
        released = true;
    }
    changed.notify_all();
    thread.join();
    if (other.valid()) other.get();
    hook.reset();
    return lines;
}

}  // namespace testsupport

// Sessions used from several threads at once. These also run alone under ThreadSanitizer
// (ctest -L concurrency).
//
// To catch a thread inside the library deterministically, fd 2 becomes a pipe of one page that
// is filled so that only the first trace line of a call fits: the thread then blocks in write(2)
// on its second line, inside the session operation, until the pipe is read.
#include <sys/ioctl.h>

#include <atomic>
#include <chrono>
#include <future>
#include <mutex>
#include <set>
#include <stdexcept>

#include "capi_support.h"

namespace {

using namespace capi;
using namespace std::chrono_literals;

// Polls `done` until it holds; false after 10 s, so that a fault fails the test instead of hanging it.
template <class Done>
bool waitUntil(Done&& done) {
    const auto deadline = std::chrono::steady_clock::now() + 10s;
    while (!done()) {
        if (std::chrono::steady_clock::now() > deadline) return false;
        std::this_thread::yield();
    }
    return true;
}

// Runs `blocked` on a thread of its own with fd 2 a pipe of one page that has room for its first
// trace line only (`firstLineSize` bytes). Once that line is in the pipe, the thread is inside the
// library, blocked writing its next line; then `meanwhile` runs (on another thread, given up after
// 10 s) and afterwards the pipe is read so that `blocked` can finish. Returns the trace messages
// that `blocked` and `meanwhile` wrote.
template <class Blocked, class Meanwhile>
std::vector<std::string> whileBlockedInTrace(std::size_t firstLineSize, Blocked&& blocked, Meanwhile&& meanwhile) {
    int ends[2];
    if (::pipe2(ends, O_CLOEXEC) != 0) throw std::system_error(errno, std::generic_category(), "pipe2");
    const int capacity = ::fcntl(ends[1], F_SETPIPE_SZ, 4096);  // rounded up to one page
    if (capacity <= static_cast<int>(firstLineSize)) throw std::runtime_error("cannot make a pipe of one page");
    const std::string filler(static_cast<std::size_t>(capacity) - firstLineSize, '#');
    EXPECT_EQ(::write(ends[1], filler.data(), filler.size()), static_cast<ssize_t>(filler.size()));
    std::optional<Fd2Redirect> redirect(std::in_place, ends[1]);
    ::close(ends[1]);  // fd 2 is now the only writing end

    std::thread thread(blocked);
    std::future<void> other;
    const auto full = [&] {
        int buffered = 0;
        return ::ioctl(ends[0], FIONREAD, &buffered) == 0 && buffered == capacity;
    };
    if (!waitUntil(full)) {
        ADD_FAILURE() << "the first trace line never arrived";
    } else {
        other = std::async(std::launch::async, meanwhile);
        if (other.wait_for(10s) != std::future_status::ready)
            ADD_FAILURE() << "the calls made meanwhile waited for the blocked thread";
    }
    std::string output;
    std::thread reader([&] {
        char buffer[4096];
        for (ssize_t n; (n = ::read(ends[0], buffer, sizeof buffer)) != 0;)
            if (n > 0) output.append(buffer, static_cast<std::size_t>(n));
            else if (errno != EINTR) return;
    });
    thread.join();
    if (other.valid()) other.get();
    redirect.reset();  // end of file for the reader
    reader.join();
    ::close(ends[0]);

    std::vector<std::string> lines;
    for (std::size_t at = filler.size(), end; at < output.size(); at = end) {
        end = std::min(output.find('\n', at), output.size() - 1) + 1;
        lines.push_back(output.substr(at, end - at));
    }
    return traceMessages(lines);
}

TEST(Concurrency, CloseDuringACallEndsTheSessionWhenTheCallReturns) {
    const ViSession vi = openTraceSession();
    const auto call = [vi] { return tiktal_ConnectTrigTerminals(vi, "PXI_Trig0", "PFI0", nullptr, 0, 1); };
    StderrCapture probe;
    EXPECT_EQ(call(), VI_SUCCESS);
    const std::vector<std::string> probeWrites = probe.finish();
    ASSERT_EQ(probeWrites.size(), 7u);

    ViStatus callStatus = -1;
    const std::vector<std::string> trace = whileBlockedInTrace(
        probeWrites[0].size(), [&] { callStatus = call(); },
        [vi] {
            EXPECT_EQ(tiktal_close(vi), VI_SUCCESS);
            EXPECT_EQ(tiktal_reset(vi), tiktalerr_invalidObject);
            EXPECT_EQ(tiktal_close(vi), VI_SUCCESS);
        });
    EXPECT_EQ(callStatus, VI_SUCCESS);
    // The call ran to its end on the session, which was destroyed only then.
    std::vector<std::string> expected = {"{ " + kTraced + "connectTrigTerminals", "srcTerminal: PXI_Trig0",
                                         "destTerminal: PFI0", "syncClock: (null)", "invert: 0", "updateEdge: 1",
                                         "} " + kTraced + "connectTrigTerminals",
                                         "{ " + kTraced + "~SessionDebugPrintOnly",
                                         "} " + kTraced + "~SessionDebugPrintOnly"};
    EXPECT_EQ(trace, expected);
    EXPECT_EQ(tiktal_ConnectTrigTerminals(vi, "PXI_Trig0", "PFI0", nullptr, 0, 1), tiktalerr_invalidObject);
}

// A session that tiktal_close destroys is destroyed before a call on another thread, on any
// handle, gets past the lookup of its handle: callers rely on the session being gone by then.
TEST(Concurrency, LookupsWaitForTheDestructorOfAClosedSession) {
    const ViSession probeSession = openTraceSession();
    StderrCapture probe;
    EXPECT_EQ(tiktal_close(probeSession), VI_SUCCESS);
    const std::vector<std::string> probeWrites = probe.finish();
    ASSERT_EQ(probeWrites.size(), 2u);

    const ViSession closing = openTraceSession();
    const std::vector<ViSession> others = {openTraceSession(), openTraceSession(), openTraceSession()};
    std::vector<std::future<ViStatus>> lookups;  // self tests on `others` (not traced), then an unknown handle
    ViStatus closeStatus = -1;
    const std::vector<std::string> trace = whileBlockedInTrace(
        probeWrites[0].size(), [&] { closeStatus = tiktal_close(closing); },
        [&] {
            for (const ViSession vi : others)
                lookups.push_back(std::async(std::launch::async, [vi] {
                    ViInt16 result = -1;
                    char message[TIKTAL_ERROR_MESSAGE_SIZE];
                    return tiktal_self_test(vi, &result, message);
                }));
            lookups.push_back(std::async(std::launch::async, [probeSession] { return tiktal_reset(probeSession); }));
            std::this_thread::sleep_for(200ms);
            for (const std::future<ViStatus>& lookup : lookups)
                EXPECT_EQ(lookup.wait_for(0s), std::future_status::timeout) << "a call went ahead of the destructor";
        });
    EXPECT_EQ(closeStatus, VI_SUCCESS);
    EXPECT_EQ(trace, (std::vector<std::string>{"{ " + kTraced + "~SessionDebugPrintOnly",
                                               "} " + kTraced + "~SessionDebugPrintOnly"}));
    ASSERT_EQ(lookups.size(), others.size() + 1);
    for (std::size_t i = 0; i < others.size(); ++i) EXPECT_EQ(lookups[i].get(), VI_SUCCESS);
    EXPECT_EQ(lookups.back().get(), tiktalerr_invalidObject);
    for (const ViSession vi : others) closeQuietly(vi);
}

// Sessions kept open answer every call while other threads open, reset and close theirs.
TEST(Concurrency, CallsOnOpenSessionsSucceedWhileOthersOpenAndClose) {
    constexpr int kCallers = 4, kOpeners = 4, kRounds = 200;
    QuietStderr quiet;  // the trace is long
    std::vector<ViSession> kept(kCallers);
    for (ViSession& vi : kept) ASSERT_EQ(tiktal_init(kTraceResource, VI_FALSE, VI_FALSE, &vi), VI_SUCCESS);
    std::mutex mutex;
    std::set<ViSession> issued(kept.begin(), kept.end());
    std::atomic<int> openersLeft{kOpeners};
    std::vector<std::thread> threads;
    for (const ViSession vi : kept)
        threads.emplace_back([&openersLeft, vi] {
            do {  // at least once, then until the openers are done
                ViInt16 result = -1;
                char message[TIKTAL_ERROR_MESSAGE_SIZE];
                ViUInt32 seconds, nanoseconds;
                ViUInt16 fraction;
                const ViStatus selfTest = tiktal_self_test(vi, &result, message);
                const ViStatus time = tiktal_GetTime(vi, &seconds, &nanoseconds, &fraction);
                if (selfTest != VI_SUCCESS || time != VI_SUCCESS) {
                    ADD_FAILURE() << "a call on the open handle 0x" << std::hex << vi << " failed: 0x" << selfTest
                                  << ", 0x" << time;
                    return;
                }
            } while (openersLeft.load() > 0);
        });
    for (int opener = 0; opener < kOpeners; ++opener)
        threads.emplace_back([&] {
            for (int round = 0; round < kRounds; ++round) {
                ViSession vi = 0;
                EXPECT_EQ(tiktal_init(kTraceResource, VI_FALSE, VI_FALSE, &vi), VI_SUCCESS);
                {
                    const std::lock_guard<std::mutex> hold(mutex);
                    EXPECT_TRUE(issued.insert(vi).second) << "handle 0x" << std::hex << vi << " issued twice";
                }
                EXPECT_EQ(tiktal_reset(vi), VI_SUCCESS);
                EXPECT_EQ(tiktal_close(vi), VI_SUCCESS);
                EXPECT_EQ(tiktal_reset(vi), tiktalerr_invalidObject);
            }
            --openersLeft;
        });
    for (std::thread& thread : threads) thread.join();
    for (const ViSession vi : kept) EXPECT_EQ(tiktal_close(vi), VI_SUCCESS);
    EXPECT_EQ(issued.size(), static_cast<std::size_t>(kCallers + kOpeners * kRounds));
}

TEST(Concurrency, ManyThreadsOpenCallAndCloseAtOnce) {
    constexpr int kThreads = 8, kRounds = 200;
    QuietStderr quiet;  // the trace is long
    std::mutex mutex;
    std::set<ViSession> open, issued;
    std::promise<void> go;
    const std::shared_future<void> start = go.get_future().share();
    const auto run = [&] {
        start.wait();
        for (int round = 0; round < kRounds; ++round) {
            ViSession vi = 0;
            ASSERT_EQ(tiktal_init(kTraceResource, VI_FALSE, round % 2 == 0 ? VI_FALSE : VI_TRUE, &vi), VI_SUCCESS);
            {
                const std::lock_guard<std::mutex> hold(mutex);
                EXPECT_TRUE(open.insert(vi).second) << "handle 0x" << std::hex << vi << " issued while open";
                issued.insert(vi);
            }
            ViUInt32 seconds = 1, nanoseconds = 2;
            ViUInt16 fraction = 3;
            EXPECT_EQ(tiktal_GetTime(vi, &seconds, &nanoseconds, &fraction), VI_SUCCESS);
            EXPECT_EQ(seconds + nanoseconds + fraction, 6u);
            EXPECT_EQ(tiktal_ConnectTrigTerminals(vi, "PXI_Trig0", "PFI0", nullptr, 0, 1), VI_SUCCESS);
            EXPECT_EQ(tiktal_GetTimeReferenceNames(vi, 0, nullptr), 1);
            char text[8] = "xxxxxxx";
            EXPECT_EQ(tiktal_GetAttributeViString(vi, "", TIKTAL_ATTR_1588_CLOCK_ID, sizeof text, text), VI_SUCCESS);
            EXPECT_EQ(text[7], '\0');
            ViInt16 result = -1;
            char message[TIKTAL_ERROR_MESSAGE_SIZE];
            EXPECT_EQ(tiktal_self_test(vi, &result, message), VI_SUCCESS);
            EXPECT_STREQ(message, "Self test passed");
            EXPECT_EQ(tiktal_SetTime(vi, 0, 0, 0, 0), tiktalerr_featureNotSupported);
            EXPECT_EQ(tiktal_error_message(vi, tiktalerr_invalidObject, message), VI_SUCCESS);
            EXPECT_STREQ(message, "The given session or object reference is invalid.");
            {
                const std::lock_guard<std::mutex> hold(mutex);
                open.erase(vi);
            }
            EXPECT_EQ(tiktal_close(vi), VI_SUCCESS);
            EXPECT_EQ(tiktal_reset(vi), tiktalerr_invalidObject);
        }
    };
    std::vector<std::thread> threads;
    for (int i = 0; i < kThreads; ++i) threads.emplace_back(run);
    go.set_value();
    for (std::thread& thread : threads) thread.join();
    EXPECT_TRUE(open.empty());
    EXPECT_EQ(issued.size(), static_cast<std::size_t>(kThreads * kRounds));  // handles count up, none repeats
}

}  // namespace

// Sessions used from several threads at once. These also run alone under ThreadSanitizer
// (ctest -L concurrency).
//
// To catch a thread inside the library deterministically, the thread is held while it writes
// its second trace line, inside the session operation (trace_block.h).
#include <atomic>
#include <chrono>
#include <future>
#include <mutex>
#include <set>

#include "capi_support.h"
#include "trace_block.h"

namespace {

using namespace capi;
using namespace std::chrono_literals;
using testsupport::whileBlockedInTrace;

TEST(Concurrency, CloseDuringACallEndsTheSessionWhenTheCallReturns) {
    const ViSession vi = openTraceSession();
    const auto call = [vi] { return tiktal_ConnectTrigTerminals(vi, "PXI_Trig0", "PFI0", nullptr, 0, 1); };
    StderrCapture probe;
    EXPECT_EQ(call(), VI_SUCCESS);
    const std::vector<std::string> probeWrites = probe.finish();
    ASSERT_EQ(probeWrites.size(), 7u);

    ViStatus callStatus = -1;
    const std::vector<std::string> trace = traceMessages(whileBlockedInTrace(
        probeWrites[0].size(), [&] { callStatus = call(); },
        [vi] {
            EXPECT_EQ(tiktal_close(vi), VI_SUCCESS);
            EXPECT_EQ(tiktal_reset(vi), tiktalerr_invalidObject);
            EXPECT_EQ(tiktal_close(vi), VI_SUCCESS);
        }));
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
    const std::vector<std::string> trace = traceMessages(whileBlockedInTrace(
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
        }));
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

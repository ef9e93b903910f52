// Time-service sessions used from many threads at once: eight threads share one session while eight
// more each use a session of their own, all against one simulator. Every read is a real HTTP round
// trip, and every result must be the service's value. Also runs under ThreadSanitizer
// (ctest -L concurrency).
#include <condition_variable>
#include <mutex>
#include <thread>
#include <vector>

#include "timeservice_support.h"

namespace {

using namespace ts;

constexpr int kThreadsPerGroup = 8;
constexpr int kReadsPerThread = 25;

// Reads of four kinds, each checked against the simulator's default state. Thread `t` starts at
// kind t, so the threads of a group ask for different attributes at the same moment.
void readMany(ViSession vi, int t) {
    for (int i = 0; i < kReadsPerThread; ++i) {
        switch ((t + i) % 4) {
        case 0:
            EXPECT_EQ(int32Of(vi, "PTP1", TIKTAL_ATTR_1588_PRIORITY2), ok(128)) << "thread " << t << " read " << i;
            EXPECT_EQ(int32Of(vi, "AS1", TIKTAL_ATTR_8021AS_PORT_STATE), ok(6)) << "thread " << t << " read " << i;
            break;
        case 1:
            EXPECT_EQ(stringOf(vi, "BC1", TIKTAL_ATTR_1588_CLOCK_ID), ok("00:80:2F:FF:FE:12:34:57"))
                << "thread " << t << " read " << i;
            break;
        case 2:
            EXPECT_EQ(booleanOf(vi, "TAB1", TIKTAL_ATTR_TIME_REFERENCE_ENABLED), ok(VI_FALSE))
                << "thread " << t << " read " << i;
            EXPECT_EQ(booleanOf(vi, "AS1", TIKTAL_ATTR_8021AS_AS_CAPABLE), ok(VI_TRUE)) << "thread " << t << " read " << i;
            break;
        default:
            EXPECT_EQ(namesOf(vi), ok("PTP1,BC1,AS1,TAB1")) << "thread " << t << " read " << i;
            break;
        }
    }
}

TEST(TimeServiceConcurrency, ManyThreadsOnOneSessionAndOnSessionsOfTheirOwn) {
    TimeServiceSim sim;  // started by this thread, which outlives the readers
    Session shared(sim.resource());
    ASSERT_STATUS(shared.status(), VI_SUCCESS);

    // All readers start together once every thread runs.
    std::mutex mutex;
    std::condition_variable changed;
    int waiting = 0;
    bool go = false;
    const auto startTogether = [&] {
        std::unique_lock<std::mutex> lock(mutex);
        ++waiting;
        changed.notify_all();
        changed.wait(lock, [&] { return go; });
    };

    std::vector<std::thread> threads;
    for (int t = 0; t < kThreadsPerGroup; ++t) {
        threads.emplace_back([&, t] {
            startTogether();
            readMany(shared.vi(), t);
        });
        threads.emplace_back([&, t] {
            Session own(sim.resource());
            EXPECT_STATUS(own.status(), VI_SUCCESS);
            startTogether();
            if (own.status() == VI_SUCCESS) readMany(own.vi(), t);
        });
    }
    {
        std::unique_lock<std::mutex> lock(mutex);
        changed.wait(lock, [&] { return waiting == 2 * kThreadsPerGroup; });
        go = true;
    }
    changed.notify_all();
    for (std::thread& thread : threads) thread.join();

    // The shared session is still usable afterwards.
    EXPECT_EQ(int32Of(shared.vi(), "PTP1", TIKTAL_ATTR_1588_PRIORITY1), ok(128));
}

}  // namespace

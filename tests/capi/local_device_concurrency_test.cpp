// Many threads open, use and close sessions of several local devices at once, and look up names
// that no device has (each such lookup drops and rebuilds the cached device list), while another
// process rewrites the configuration file under its lock the whole time.
#include <gtest/gtest.h>
#include <signal.h>
#include <tiktal/tiktal.h>

#include <atomic>
#include <chrono>
#include <fstream>
#include <iterator>
#include <string>
#include <thread>
#include <vector>

#include "local_machine.h"

namespace {

// Rewrites the configuration file as the library does (lock, read, replace by rename with the new
// file locked first), counting in a device of its own, until it is stopped.
constexpr char kRewriter[] = R"(
import fcntl, json, os, sys, tempfile
path, count = sys.argv[1], 0
print("ready", flush=True)
while True:
    with open(path, "a+") as old:
        fcntl.lockf(old, fcntl.LOCK_EX)
        if not os.path.exists(path) or os.stat(path).st_ino != os.fstat(old.fileno()).st_ino:
            continue
        old.seek(0)
        data = json.loads(old.read() or '{"version": 1}')
        data.setdefault("devices", {})["PCI:rewriter"] = {"alias": "Rewriter", "count": count}
        count += 1
        handle, temporary = tempfile.mkstemp(dir=os.path.dirname(path), prefix=".rewriter.")
        with os.fdopen(handle, "w") as new:
            fcntl.lockf(new, fcntl.LOCK_EX)
            json.dump(data, new, indent=1)
            new.flush()
            os.fsync(new.fileno())
            os.rename(temporary, path)
)";

class LocalDevicesConcurrently : public ::testing::Test, protected localmachine::LocalMachine {};

TEST_F(LocalDevicesConcurrently, SessionsOfSeveralDevicesWhileTheFileIsRewritten) {
    const tiktaltest::StartedChild rewriter = tiktaltest::startChild(
        {"/usr/bin/python3", "-c", kRewriter, dataDirectory() + "/tiktal.config"}, "ready", std::chrono::seconds(10));
    ASSERT_TRUE(rewriter.problem.empty()) << rewriter.problem;

    constexpr int kThreads = 6;
    constexpr int kRounds = 25;
    std::atomic<int> failures{0};
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t)
        threads.emplace_back([&, t] {
            const char* names[] = {"PXI1Slot2", "pxi1slot4", "PXI0::2-2.0::INSTR", "SyncTestInternal___", "NoSuchDevice"};
            for (int round = 0; round < kRounds; ++round) {
                const char* name = names[(t + round) % 5];
                ViSession vi = 0;
                const ViStatus opened = tiktal_init(const_cast<ViRsrc>(name), VI_FALSE, VI_FALSE, &vi);
                if (std::string(name) == "NoSuchDevice") {
                    failures += opened != tiktalerr_deviceNotFound;
                    continue;
                }
                ViInt32 id = 0;
                ViReal64 value = 0;
                const bool used = opened == VI_SUCCESS && tiktal_GetAttributeViInt32(vi, "", 1150002, &id) == VI_SUCCESS &&
                                  tiktal_SetAttributeViReal64(vi, "", 1150100 + t % 6, round) == VI_SUCCESS &&
                                  tiktal_GetAttributeViReal64(vi, "", 1150100 + t % 6, &value) == VI_SUCCESS;
                failures += !used || tiktal_close(vi) != VI_SUCCESS;
            }
        });
    for (std::thread& thread : threads) thread.join();
    EXPECT_EQ(tiktaltest::stopChild(rewriter.pid, SIGTERM, std::chrono::seconds(5)), 128 + SIGTERM);
    EXPECT_EQ(failures.load(), 0);

    // Neither the library's writes nor the other process's were lost.
    std::ifstream file(dataDirectory() + "/tiktal.config");
    const std::string text((std::istreambuf_iterator<char>(file)), std::istreambuf_iterator<char>());
    EXPECT_NE(text.find("\"Rewriter\""), std::string::npos);
    EXPECT_NE(text.find("\"PXI1Slot4\""), std::string::npos);
}

}  // namespace

// Several processes on one configuration file at once: updates under the lock are never lost, a
// process whose file another one replaced while it waited locks the new file, and a writer
// killed in the middle of writing leaves a complete file.
#include <signal.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstdio>
#include <functional>
#include <string>
#include <thread>
#include <vector>

#include "config/loader.h"
#include "config/lockable_file.h"
#include "config_test_support.h"
#include "forked.h"

namespace {

using configtest::exitStatusOf;
using configtest::KilledAtEnd;
using configtest::startProcess;

using zrjsonconfig::LockableFile;

// One update as the session factory makes it: open, lock, read, parse, add a device, write.
void addDevice(LockableFile& file, const std::string& token) {
    file.lock();
    zrjsonconfig::LoadedConfiguration loaded = zrjsonconfig::parseConfiguration(file.read(), file.path());
    zrjsonconfig::JsonTree configured = zrjsonconfig::newObject();
    cJSON_AddStringToObject(configured.get(), "alias", token.c_str());
    loaded.data.add(token, std::move(configured), zrjsonconfig::newObject());
    file.write(loaded.data.configuredText());
    file.unlock();
}

ino_t inodeOf(const std::string& path) {
    struct stat status {};
    return ::stat(path.c_str(), &status) == 0 ? status.st_ino : 0;
}

std::vector<std::string> tokensInFile(const std::string& path) {
    std::vector<std::string> tokens;
    const zrjsonconfig::LoadedConfiguration loaded = zrjsonconfig::parseConfiguration(configtest::readText(path), path);
    for (const auto& [token, entry] : loaded.data.entries()) tokens.push_back(token);
    return tokens;
}

std::vector<std::string> expectedTokens(int writers, int rounds) {
    std::vector<std::string> tokens;
    for (int writer = 0; writer < writers; ++writer)
        for (int round = 0; round < rounds; ++round) tokens.push_back("w" + std::to_string(writer) + "-" + std::to_string(round));
    std::sort(tokens.begin(), tokens.end());
    return tokens;
}

TEST(ConfigFileProcesses, EightProcessesChangingTheFileAtOnceLoseNoUpdate) {
    configtest::Sysroot machine;
    constexpr int kWriters = 8;
    constexpr int kRounds = 40;
    std::vector<pid_t> writers;
    for (int writer = 0; writer < kWriters; ++writer)
        writers.push_back(startProcess([writer] {
            // Half of the writers open the file anew for every update, half keep it open: both
            // must follow the file as the others replace it.
            LockableFile kept(zrjsonconfig::configFilePath(), true);
            for (int round = 0; round < kRounds; ++round) {
                const std::string token = "w" + std::to_string(writer) + "-" + std::to_string(round);
                if (writer % 2 == 0) {
                    addDevice(kept, token);
                } else {
                    LockableFile fresh(zrjsonconfig::configFilePath(), true);
                    addDevice(fresh, token);
                }
            }
        }));
    for (pid_t pid : writers) EXPECT_EQ(exitStatusOf(pid), 0);
    EXPECT_EQ(tokensInFile(machine.configPath()), expectedTokens(kWriters, kRounds));
    EXPECT_EQ(configtest::namesIn(machine.dataDirectory()), (std::vector<std::string>{"tiktal.config"}));
}

TEST(ConfigFileProcesses, ThreadsOfOneProcessExcludeEachOtherWithOneFileOrSeveral) {
    configtest::Sysroot machine;
    constexpr int kRounds = 40;
    LockableFile shared(zrjsonconfig::configFilePath(), true);
    std::vector<std::thread> threads;
    for (int writer = 0; writer < 4; ++writer)
        threads.emplace_back([&shared, writer] {
            LockableFile own(zrjsonconfig::configFilePath(), true);
            for (int round = 0; round < kRounds; ++round)
                addDevice(writer < 2 ? shared : own, "w" + std::to_string(writer) + "-" + std::to_string(round));
        });
    for (std::thread& thread : threads) thread.join();
    EXPECT_EQ(tokensInFile(machine.configPath()), expectedTokens(4, kRounds));
}

TEST(ConfigFileProcesses, AProcessWaitingOnAReplacedFileLocksAndReadsTheNewOne) {
    configtest::Sysroot machine;
    const std::string path = machine.configPath();
    configtest::writeText(path, "first");

    int opened[2], locked[2], result[2];
    ASSERT_EQ(::pipe(opened), 0);
    ASSERT_EQ(::pipe(locked), 0);
    ASSERT_EQ(::pipe(result), 0);
    // Started before this process opens the file: a child that inherited the open file would
    // hold its lock as long as it lives.
    const pid_t waiter = startProcess([&] {
        ::close(locked[1]);
        ::close(result[0]);
        LockableFile file(path, false);  // opens the file that is about to be replaced
        ::close(opened[1]);              // tells the parent
        char go;
        if (::read(locked[0], &go, 1) != 0) ::_exit(2);
        file.lock();
        const std::string text = file.read();
        file.unlock();
        if (::write(result[1], text.data(), text.size()) != static_cast<ssize_t>(text.size())) ::_exit(2);
    });
    ::close(opened[1]);
    ::close(result[1]);
    ::close(locked[0]);
    char ignored;
    ASSERT_EQ(::read(opened[0], &ignored, 1), 0);  // the waiter has opened the first file
    LockableFile holder(path, false);
    holder.lock();
    ::close(locked[1]);  // the waiter may try to lock now
    // Most likely the waiter is blocked in lock() by now; if not, it finds the replaced file
    // when it gets there, and has to open the new one all the same.
    std::this_thread::sleep_for(std::chrono::milliseconds(50));
    // Two replacements under one lock: a waiter that took the lock of the file in between would
    // read "second" while this process still holds the lock of the one it wrote last.
    holder.write("second");
    holder.write("third");
    holder.unlock();

    std::string text;
    char buffer[64];
    for (ssize_t got; (got = ::read(result[0], buffer, sizeof buffer)) > 0;) text.append(buffer, got);
    ::close(result[0]);
    ::close(opened[0]);
    EXPECT_EQ(exitStatusOf(waiter), 0);
    EXPECT_EQ(text, "third");
}

// A configuration text of about `size` bytes, different for each `round`; it parses only whole.
std::string largeConfiguration(int round, std::size_t size) {
    std::string text = "{\"version\":1,\"devices\":{\"round" + std::to_string(round) + "\":{\"padding\":\"";
    text.append(size, static_cast<char>('a' + round % 26));
    return text + "\"}}}";
}

TEST(ConfigFileProcesses, AWriterKilledWhileWritingNeverLeavesAPartialFile) {
    configtest::Sysroot machine;
    const std::string path = machine.configPath();
    configtest::writeText(path, largeConfiguration(0, 10));
    int killedWhileWriting = 0;
    for (int attempt = 0; attempt < 12 && killedWhileWriting < 3; ++attempt) {
        const ino_t before = inodeOf(path);
        const pid_t writer = startProcess([&] {
            // Made beforehand, so that the writer spends nearly all of its time writing.
            const std::string texts[] = {largeConfiguration(1, 8 * 1024 * 1024), largeConfiguration(2, 8 * 1024 * 1024 + 4099)};
            LockableFile file(path, false);
            for (int round = 0;; ++round) {
                file.lock();
                file.write(texts[round % 2]);
                file.unlock();
            }
        });
        KilledAtEnd guard(writer);
        // Readers that take no lock at all see only whole files, before and while it writes.
        int readsOfNewFiles = 0;
        for (int reads = 0; readsOfNewFiles < 2 && reads < 100000; ++reads) {
            const std::string text = configtest::readText(path);
            ASSERT_NO_THROW(zrjsonconfig::parseConfiguration(text, path)) << "a partial file of " << text.size() << " bytes";
            if (inodeOf(path) != before) ++readsOfNewFiles;
        }
        std::this_thread::sleep_for(std::chrono::microseconds(1000 * attempt));
        ::kill(writer, SIGKILL);
        EXPECT_EQ(exitStatusOf(writer), 128 + SIGKILL);
        guard.pid = -1;

        // A file the writer had begun is left beside the configuration, never in its place.
        const std::vector<std::string> names = configtest::namesIn(machine.dataDirectory());
        if (names.size() > 1) ++killedWhileWriting;
        for (const std::string& name : names) {
            if (name != "tiktal.config") {
                EXPECT_EQ(name.rfind(".tiktal.config.", 0), 0u) << name;
            }
        }

        LockableFile file(path, false);
        file.lock();  // the lock died with the writer
        const std::string text = file.read();
        EXPECT_GT(text.size(), 8u * 1024 * 1024);
        const zrjsonconfig::LoadedConfiguration loaded = zrjsonconfig::parseConfiguration(text, path);
        EXPECT_EQ(loaded.data.entries().size(), 1u);
        // The next writer, holding the lock, removes what the killed one left.
        file.write(text);
        EXPECT_EQ(configtest::namesIn(machine.dataDirectory()), std::vector<std::string>{"tiktal.config"});
        file.unlock();
    }
    // The writer does little else than writing, so some kills come in the middle of it.
    EXPECT_GT(killedWhileWriting, 0);
}

}  // namespace

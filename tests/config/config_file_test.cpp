// The configuration file on real files: where it lies, opening and creating it, reading it within
// its size limit, replacing it atomically (through links, keeping owner and mode, or in place
// where the folder may not change), its whole-file lock, and the failures with their details.
#include <fcntl.h>
#include <grp.h>
#include <sys/stat.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include <atomic>
#include <cerrno>
#include <chrono>
#include <functional>
#include <string>
#include <thread>
#include <vector>

#include "config/lockable_file.h"
#include "config_test_support.h"
#include "forked.h"

namespace {

using configtest::Details;
using configtest::failureOf;
using zrjsonconfig::LockableFile;

struct stat statusOf(const std::string& path) {
    struct stat status {};
    EXPECT_EQ(::stat(path.c_str(), &status), 0) << path;
    return status;
}
ino_t inodeOf(const std::string& path) { return statusOf(path).st_ino; }

// Whether another open of the file (in this process: open-file-description locks of one process
// exclude each other too) finds it locked.
bool lockedElsewhere(const std::string& path) {
    const int descriptor = ::open(path.c_str(), O_RDWR | O_CLOEXEC);
    EXPECT_GE(descriptor, 0) << path;
    struct flock range {};
    range.l_type = F_WRLCK;
    range.l_whence = SEEK_SET;
    const bool locked = ::fcntl(descriptor, F_OFD_SETLK, &range) != 0 && (errno == EAGAIN || errno == EACCES);
    ::close(descriptor);
    return locked;
}

TEST(ConfigFile, LiesInTheDataDirectoryOfTheSimulatedMachine) {
    configtest::Sysroot machine;
    EXPECT_EQ(zrjsonconfig::configFilePath(), machine.root() + "/var/lib/Korvane/tiktal/tiktal.config");
    unsetenv("TIKTAL_SYSROOT");
    EXPECT_EQ(zrjsonconfig::configFilePath(), "/var/lib/Korvane/tiktal/tiktal.config");
}

TEST(ConfigFile, OpeningCreatesTheFileAndItsFoldersOnlyWhenAllowed) {
    configtest::Sysroot machine;
    const std::string path = zrjsonconfig::configFilePath();

    const Details missing = failureOf([&] { LockableFile file(path, false); });
    EXPECT_EQ(missing.code, -52006);
    EXPECT_EQ(missing.constant, "nZRAPALS100::tStatus::kResourceNotFound");
    EXPECT_EQ(missing.translator, "vllator_tiktal");
    EXPECT_EQ(missing.records, (std::vector<std::string>{"kUsageTypeFilePath=" + path, "# Failed to open file"}));
    EXPECT_EQ(missing.api, "open");
    EXPECT_EQ(missing.osCode, ENOENT);
    EXPECT_EQ(missing.osStatus, -52006);
    EXPECT_FALSE(std::filesystem::exists(machine.dataDirectory()));

    {
        LockableFile file(path, true);
        file.lock();
        EXPECT_EQ(file.read(), "");
        file.unlock();
    }
    EXPECT_TRUE(std::filesystem::is_regular_file(path));
    EXPECT_EQ(std::filesystem::file_size(path), 0u);

    // An existing file is opened as it is, whether creation is allowed or not.
    configtest::writeText(path, "{\"version\":1}");
    for (bool create : {false, true}) {
        LockableFile file(path, create);
        file.lock();
        EXPECT_EQ(file.read(), "{\"version\":1}");
        file.unlock();
    }
}

TEST(ConfigFile, WhatStandsInTheWayOfTheFileFailsToOpen) {
    configtest::Sysroot machine;
    // A folder on the way that is a link to nowhere: the data directory cannot be made in it.
    std::filesystem::create_directories(machine.root() + "/var/lib");
    std::filesystem::create_symlink(machine.root() + "/nowhere/Korvane", machine.root() + "/var/lib/Korvane");
    const Details folder = failureOf([] { LockableFile file(zrjsonconfig::configFilePath(), true); });
    EXPECT_EQ(folder.code, -52006);
    EXPECT_EQ(folder.constant, "nZRAPALS100::tStatus::kResourceNotFound");
    EXPECT_EQ(folder.records, (std::vector<std::string>{"kUsageTypeFilePath=" + machine.configPath(),
                                                        "# Failed to create the folder " + machine.dataDirectory()}));
    EXPECT_EQ(folder.api, "mkdir");
    EXPECT_EQ(folder.osCode, ENOENT);

    // A file where a folder on the way should be.
    std::filesystem::remove(machine.root() + "/var/lib/Korvane");
    configtest::writeText(machine.root() + "/var/lib/Korvane", "not a folder");
    const Details file = failureOf([] { LockableFile file(zrjsonconfig::configFilePath(), true); });
    EXPECT_EQ(file.code, -52006);
    EXPECT_EQ(file.records, (std::vector<std::string>{"kUsageTypeFilePath=" + machine.configPath(), "# Failed to open file",
                                                      "# A part of the path on the way to the file is not a folder"}));
    EXPECT_EQ(file.api, "open");
    EXPECT_EQ(file.osCode, ENOTDIR);

    // What stands at the path itself.
    std::filesystem::remove(machine.root() + "/var/lib/Korvane");
    std::filesystem::create_directories(machine.dataDirectory());
    const std::string path = machine.configPath(), elsewhere = machine.root() + "/elsewhere";
    const struct {
        std::function<void()> make;
        int osCode;
        std::string wrong;
    } cases[] = {
        {[&] { std::filesystem::create_directories(path); }, EISDIR, "The path is a folder"},
        {[&] { std::filesystem::create_symlink(path, path); }, ELOOP,
         "The path leads through too many levels of links (a loop of links)"},
        {[&] { std::filesystem::create_symlink(elsewhere + "/tiktal.config", path); }, ENOENT,
         "The path is a dangling link to " + elsewhere + "/tiktal.config"},
        {[&] { ::mkfifo(path.c_str(), 0666); }, EINVAL, "The path is not a regular file"},
    };
    for (const auto& entry : cases) {
        std::filesystem::remove(path);
        entry.make();
        const Details failed = failureOf([&] { LockableFile file(path, true); });
        EXPECT_EQ(failed.code, -52006) << entry.wrong;
        EXPECT_EQ(failed.records, (std::vector<std::string>{"kUsageTypeFilePath=" + path, "# Failed to open file", "# " + entry.wrong}));
        EXPECT_EQ(failed.osCode, entry.osCode) << entry.wrong;
    }
    // A dangling link into a folder that exists: the file is made where the link points.
    std::filesystem::remove(path);
    std::filesystem::create_symlink(elsewhere + "/tiktal.config", path);
    std::filesystem::create_directories(elsewhere);
    {
        LockableFile file(path, true);
        file.lock();
        file.write("{}");
    }
    EXPECT_TRUE(std::filesystem::is_symlink(path));
    EXPECT_EQ(configtest::readText(elsewhere + "/tiktal.config"), "{}");
}

TEST(ConfigFile, ReadsAndWritesFilesUpToTheLimitAndRefusesLargerOnes) {
    configtest::Sysroot machine;
    const std::string path = machine.configPath();
    configtest::writeText(path, "");
    LockableFile file(path, false);
    file.lock();

    ASSERT_EQ(::truncate(path.c_str(), LockableFile::kMaxSize), 0);
    EXPECT_EQ(file.read().size(), LockableFile::kMaxSize);

    ASSERT_EQ(::truncate(path.c_str(), LockableFile::kMaxSize + 1), 0);
    const Details tooLarge = failureOf([&] { file.read(); });
    EXPECT_EQ(tooLarge.code, -52012);
    EXPECT_EQ(tooLarge.constant, "nZRAPALS100::tStatus::kEndOfData");
    EXPECT_EQ(tooLarge.records, (std::vector<std::string>{"kUsageTypeFilePath=" + path, "# Failed to read file",
                                                          "# The file is larger than 16 MiB"}));
    EXPECT_EQ(tooLarge.osCode, EFBIG);

    // Every file written is one that can be read back; a larger text leaves the file as it was.
    file.write(std::string(LockableFile::kMaxSize, ' '));
    const Details notWritten = failureOf([&] { file.write(std::string(LockableFile::kMaxSize + 1, ' ')); });
    EXPECT_EQ(notWritten.code, -52012);
    EXPECT_EQ(notWritten.records,
              (std::vector<std::string>{"kUsageTypeFilePath=" + path, "# Failed to write file",
                                        "# The new text of 16777217 bytes is larger than 16 MiB, which no process reads"}));
    EXPECT_EQ(notWritten.osCode, EFBIG);
    EXPECT_EQ(file.read().size(), LockableFile::kMaxSize);
    file.unlock();
}

TEST(ConfigFile, WriteReplacesTheFileWholeAndKeepsItLocked) {
    configtest::Sysroot machine;
    const std::string path = machine.configPath();
    configtest::writeText(path, std::string(100000, 'x'));
    ASSERT_EQ(::chmod(path.c_str(), 0640), 0);
    const ino_t before = inodeOf(path);

    LockableFile file(path, false);
    file.lock();
    EXPECT_TRUE(lockedElsewhere(path));
    file.write("short");
    // A new file took the old one's place: nothing of the longer old text remains after the new.
    EXPECT_NE(inodeOf(path), before);
    EXPECT_EQ(configtest::readText(path), "short");
    EXPECT_EQ(file.read(), "short");
    EXPECT_EQ(std::filesystem::status(path).permissions(),
              std::filesystem::perms::owner_read | std::filesystem::perms::owner_write | std::filesystem::perms::group_read);
    EXPECT_EQ(configtest::namesIn(machine.dataDirectory()), (std::vector<std::string>{"tiktal.config"}));
    // The lock moved along to the new file, and stays through further writes until unlock.
    EXPECT_TRUE(lockedElsewhere(path));
    file.write("");
    EXPECT_EQ(file.read(), "");
    EXPECT_TRUE(lockedElsewhere(path));
    file.unlock();
    EXPECT_FALSE(lockedElsewhere(path));

    // Written without the lock, the new file is not locked either.
    file.write("unlocked");
    EXPECT_FALSE(lockedElsewhere(path));
    EXPECT_EQ(configtest::readText(path), "unlocked");
}

TEST(ConfigFile, AFailedWriteLeavesTheOldFileAndReportsTheCall) {
    configtest::Sysroot machine;
    const std::string path = machine.configPath();
    configtest::writeText(path, "old");
    LockableFile file(path, false);
    file.lock();
    // The folder the new text would go into is gone.
    const std::string moved = machine.root() + "/moved";
    std::filesystem::rename(machine.dataDirectory(), moved);
    const Details failed = failureOf([&] { file.write("new"); });
    EXPECT_EQ(failed.code, -52012);
    EXPECT_EQ(failed.constant, "nZRAPALS100::tStatus::kEndOfData");
    EXPECT_EQ(failed.records, (std::vector<std::string>{"kUsageTypeFilePath=" + path, "# Failed to write file"}));
    EXPECT_EQ(failed.api, "realpath");
    EXPECT_EQ(failed.osCode, ENOENT);
    EXPECT_EQ(configtest::readText(moved + "/tiktal.config"), "old");
    EXPECT_EQ(configtest::namesIn(moved), (std::vector<std::string>{"tiktal.config"}));
    file.unlock();
}

TEST(ConfigFile, WriteThroughLinksReplacesTheFileAtTheirEndKeepingOwnerGroupAndMode) {
    configtest::Sysroot machine;
    const std::string path = machine.configPath(), middle = machine.root() + "/etc/tiktal",
                      target = machine.root() + "/etc/real/tiktal.json";
    configtest::writeText(target, "old");
    configtest::writeText(machine.root() + "/etc/real/.tiktal.json.Ab12Cd", "left by a killed writer");
    ASSERT_EQ(::chown(target.c_str(), 1234, 5678), 0);
    ASSERT_EQ(::chmod(target.c_str(), 0640), 0);
    std::filesystem::create_directories(machine.dataDirectory());
    std::filesystem::create_symlink(middle, path);
    std::filesystem::create_symlink("real/tiktal.json", middle);
    LockableFile waiting(path, false);  // holds the old file when the other one replaces it

    LockableFile file(path, false);
    file.lock();
    file.write("new");
    EXPECT_TRUE(std::filesystem::is_symlink(path) && std::filesystem::is_symlink(middle));
    EXPECT_EQ(configtest::readText(target), "new");
    EXPECT_EQ(configtest::namesIn(machine.root() + "/etc/real"), (std::vector<std::string>{"tiktal.json"}));
    const struct stat status = statusOf(target);
    EXPECT_EQ(status.st_uid, 1234u);
    EXPECT_EQ(status.st_gid, 5678u);
    EXPECT_EQ(status.st_mode & 07777, 0640u);
    EXPECT_TRUE(lockedElsewhere(path));
    file.unlock();

    // The lock guards the file at the end of the links: a locker that held the old one opens the new.
    waiting.lock();
    EXPECT_EQ(waiting.read(), "new");
    waiting.unlock();
}

TEST(ConfigFile, AWriterThatMayNotChangeTheFolderRewritesTheFileInPlace) {
    if (::geteuid() != 0) GTEST_SKIP() << "needs root to become the user nobody";
    configtest::Sysroot machine;
    ASSERT_EQ(::chmod(machine.root().c_str(), 0755), 0);  // made 0700: nobody could not reach the file
    // A root folder that only root may change, and one where everyone may make files but not
    // replace another user's.
    for (const mode_t folderMode : {0755, 01777}) {
        const std::string folder = machine.root() + "/" + std::to_string(folderMode), path = folder + "/tiktal.config";
        configtest::writeText(path, std::string(100, 'x'));
        ASSERT_EQ(::chmod(folder.c_str(), folderMode), 0);
        ASSERT_EQ(::chmod(path.c_str(), 0666), 0);
        const ino_t before = inodeOf(path);
        const pid_t writer = configtest::startProcess([&] {
            if (::setgroups(0, nullptr) != 0 || ::setgid(65534) != 0 || ::setuid(65534) != 0) ::_exit(2);
            LockableFile file(path, false);
            file.lock();
            file.write("new");
            file.unlock();
        });
        EXPECT_EQ(configtest::exitStatusOf(writer), 0) << folderMode;
        LockableFile file(path, false);
        file.lock();
        EXPECT_EQ(file.read(), "new") << folderMode;
        file.unlock();
        EXPECT_EQ(inodeOf(path), before);
        EXPECT_EQ(configtest::namesIn(folder), (std::vector<std::string>{"tiktal.config"}));
    }
}

TEST(ConfigFile, LockWaitsForAnotherLockOnlyUpToItsLimit) {
    configtest::Sysroot machine;
    const std::string path = machine.configPath();
    configtest::writeText(path, "");
    // A read lock that any user who may read the file can take.
    const int reader = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
    struct flock range {};
    range.l_type = F_RDLCK;
    ASSERT_EQ(::fcntl(reader, F_OFD_SETLK, &range), 0);

    LockableFile file(path, false);
    const Details timedOut = failureOf([&] { file.lock(std::chrono::milliseconds(100)); });
    EXPECT_EQ(timedOut.code, -52007);
    EXPECT_EQ(timedOut.constant, "zrapalerr_timeout");
    EXPECT_EQ(timedOut.records, (std::vector<std::string>{"kUsageTypeFilePath=" + path, "# Failed to lock file",
                                                          "# Another process held a lock on the file for 0.1 s"}));
    EXPECT_EQ(timedOut.osCode, ETIMEDOUT);
    EXPECT_EQ(timedOut.osStatus, -52007);

    // A lock let go while the library waits is taken.
    std::thread letGo([reader] {
        std::this_thread::sleep_for(std::chrono::milliseconds(50));
        ::close(reader);
    });
    file.lock();
    letGo.join();
    EXPECT_TRUE(lockedElsewhere(path));
    file.unlock();

    // Nor is a waiter kept out for good by a holder that lets go and takes the lock again at once.
    std::atomic<bool> stop = false;
    std::thread looping([&] {
        LockableFile other(path, false);
        while (!stop) {
            other.lock();
            std::this_thread::sleep_for(std::chrono::milliseconds(50));
            other.unlock();
        }
    });
    std::this_thread::sleep_for(std::chrono::milliseconds(50));
    EXPECT_FALSE(failureOf([&] { file.lock(std::chrono::seconds(1)); }).raised) << "kept out for 1 s";
    stop = true;
    file.unlock();
    looping.join();
}

TEST(ConfigFile, ALockerWhoseFileWasRemovedCreatesItAgainOrFails) {
    configtest::Sysroot machine;
    const std::string path = machine.configPath();
    configtest::writeText(path, "old");
    LockableFile creating(path, true);
    LockableFile notCreating(path, false);
    std::filesystem::remove(path);

    creating.lock();
    EXPECT_EQ(creating.read(), "");
    EXPECT_TRUE(lockedElsewhere(path));
    creating.unlock();

    std::filesystem::remove(path);
    const Details gone = failureOf([&] { notCreating.lock(); });
    EXPECT_EQ(gone.code, -52006);
    EXPECT_EQ(gone.records, (std::vector<std::string>{"kUsageTypeFilePath=" + path, "# Failed to open file"}));
}

}  // namespace

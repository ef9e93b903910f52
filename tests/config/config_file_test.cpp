// The configuration file on real files: where it lies, opening and creating it, reading it within
// its size limit, replacing it atomically, its whole-file lock, and the failures with their
// details.
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include <cerrno>
#include <string>
#include <vector>

#include "config/lockable_file.h"
#include "config_test_support.h"

namespace {

using configtest::Details;
using configtest::failureOf;
using zrjsonconfig::LockableFile;

ino_t inodeOf(const std::string& path) {
    struct stat status {};
    EXPECT_EQ(::stat(path.c_str(), &status), 0) << path;
    return status.st_ino;
}

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
    EXPECT_EQ(file.records, (std::vector<std::string>{"kUsageTypeFilePath=" + machine.configPath(), "# Failed to open file"}));
    EXPECT_EQ(file.api, "open");
    EXPECT_EQ(file.osCode, ENOTDIR);

    // A folder where the file should be.
    std::filesystem::remove(machine.root() + "/var/lib/Korvane");
    std::filesystem::create_directories(machine.configPath());
    const Details directory = failureOf([] { LockableFile file(zrjsonconfig::configFilePath(), true); });
    EXPECT_EQ(directory.code, -52006);
    EXPECT_EQ(directory.api, "open");
    EXPECT_EQ(directory.osCode, EISDIR);
}

TEST(ConfigFile, ReadsFilesUpToTheLimitAndRefusesLargerOnes) {
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
    EXPECT_EQ(failed.api, "mkostemp");
    EXPECT_EQ(failed.osCode, ENOENT);
    EXPECT_EQ(configtest::readText(moved + "/tiktal.config"), "old");
    EXPECT_EQ(configtest::namesIn(moved), (std::vector<std::string>{"tiktal.config"}));
    file.unlock();
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

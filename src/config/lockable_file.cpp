#include "config/lockable_file.h"

#include <algorithm>
#include <cstdio>
#include <cstring>

#include "config/failure.h"

namespace zrjsonconfig {
namespace {

constexpr char kFileName[] = "tiktal.config";

std::string folderOf(const std::string& path) {
    const std::size_t slash = path.rfind('/');
    if (slash == std::string::npos) return ".";
    return slash == 0 ? "/" : path.substr(0, slash);
}

// What stands in the way of opening `path`, which failed with `error`; "" when the error says it.
std::string whatIsWrong(const std::string& path, int error) {
    std::string target;
    switch (error) {
    case platform::error::kIsAFolder: return "The path is a folder";
    case platform::error::kInvalid: return "The path is not a regular file";
    case platform::error::kLinkLoop: return "The path leads through too many levels of links (a loop of links)";
    case platform::error::kNotAFolder: return "A part of the path on the way to the file is not a folder";
    case platform::error::kNotFound:
        if (!platform::readLink(path, target)) return "The path is a dangling link to " + target;
        return "";
    default: return "";
    }
}

std::string secondsText(std::chrono::milliseconds time) {
    char text[32];
    std::snprintf(text, sizeof text, "%g s", static_cast<double>(time.count()) / 1000);
    return text;
}

}  // namespace

std::string configFilePath() { return platform::dataDirectory() + "/" + kFileName; }

LockableFile::LockableFile(std::string path, bool createIfMissing) : _path(std::move(path)), _create(createIfMissing) {
    open();
}

LockableFile::~LockableFile() {
    if (_locked) {
        _file.close();  // ends the whole-file lock
        _threads.unlock();
    }
}

// Opening and creating are one step for the system, so the retries that creating a file needs
// where another process may hold it open without sharing are not needed here.
void LockableFile::open() {
    platform::OsError error = _file.open(_path, _create);
    if (error.code == platform::error::kNotFound && _create) {
        const std::string folder = folderOf(_path);
        if (const platform::OsError folderError = platform::makeDirectories(folder))
            ZRJSONCONFIG_FAILURE(kResourceNotFound)
                .usage(kUsageTypeFilePath, _path)
                .comment("Failed to create the folder " + folder)
                .osError(folderError)
                .raise();
        error = _file.open(_path, _create);
    }
    if (error) {
        Failure failure = ZRJSONCONFIG_FAILURE(kResourceNotFound);
        failure.usage(kUsageTypeFilePath, _path).comment("Failed to open file").osError(error);
        const std::string wrong = whatIsWrong(_path, error.code);
        if (!wrong.empty()) failure.comment(wrong);
        failure.raise();
    }
}

void LockableFile::lock(std::chrono::milliseconds limit) {
    using Clock = std::chrono::steady_clock;
    std::unique_lock<std::mutex> threads(_threads);
    const Clock::time_point deadline = Clock::now() + limit;
    for (;;) {
        const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(deadline - Clock::now());
        if (const platform::OsError error = _file.lock(std::max(left, std::chrono::milliseconds(0)))) {
            Failure failure = ZRJSONCONFIG_FAILURE(error.code == platform::error::kTimedOut ? kTimeout : kOsFault);
            failure.usage(kUsageTypeFilePath, _path).comment("Failed to lock file").osError(error);
            if (error.code == platform::error::kTimedOut) failure.comment("Another process held a lock on the file for " + secondsText(limit));
            failure.raise();
        }
        bool current = false;
        if (const platform::OsError error = _file.namesPath(current))
            ZRJSONCONFIG_FAILURE(kOsFault).usage(kUsageTypeFilePath, _path).comment("Failed to lock file").osError(error).raise();
        if (current) break;
        // Another process replaced the file while this one waited: the lock guards a file that
        // no longer counts. Closing ends that lock.
        _file.close();
        open();
    }
    _locked = true;
    threads.release();  // held until unlock()
}

void LockableFile::unlock() {
    if (!_locked) return;
    const platform::OsError error = _file.unlock();
    _locked = false;
    _threads.unlock();
    if (error)
        ZRJSONCONFIG_FAILURE(kOsFault).usage(kUsageTypeFilePath, _path).comment("Failed to unlock file").osError(error).raise();
}

std::string LockableFile::read() {
    std::string text;
    if (const platform::OsError error = _file.readAll(kMaxSize, text)) {
        Failure failure = ZRJSONCONFIG_FAILURE(kEndOfData);
        failure.usage(kUsageTypeFilePath, _path).comment("Failed to read file").osError(error);
        if (error.code == platform::error::kFileTooLarge) failure.comment("The file is larger than 16 MiB");
        failure.raise();
    }
    return text;
}

void LockableFile::write(const std::string& text) {
    if (text.size() > kMaxSize)
        ZRJSONCONFIG_FAILURE(kEndOfData)
            .usage(kUsageTypeFilePath, _path)
            .comment("Failed to write file")
            .comment("The new text of " + std::to_string(text.size()) + " bytes is larger than 16 MiB, which no process reads")
            .osError({"write", platform::error::kFileTooLarge})
            .raise();
    if (const platform::OsError error = _file.replace(text)) {
        const bool flushing = std::strcmp(error.api, "fsync") == 0;
        ZRJSONCONFIG_FAILURE(kEndOfData)
            .usage(kUsageTypeFilePath, _path)
            .comment(flushing ? "Failed to flush file" : "Failed to write file")
            .osError(error)
            .raise();
    }
}

}  // namespace zrjsonconfig

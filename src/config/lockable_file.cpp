#include "config/lockable_file.h"

#include <cerrno>
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
    if (error.code == ENOENT && _create) {
        const std::string folder = folderOf(_path);
        if (const platform::OsError folderError = platform::makeDirectories(folder))
            ZRJSONCONFIG_FAILURE(kResourceNotFound)
                .usage(kUsageTypeFilePath, _path)
                .comment("Failed to create the folder " + folder)
                .osError(folderError)
                .raise();
        error = _file.open(_path, _create);
    }
    if (error)
        ZRJSONCONFIG_FAILURE(kResourceNotFound)
            .usage(kUsageTypeFilePath, _path)
            .comment("Failed to open file")
            .osError(error)
            .raise();
}

void LockableFile::lock() {
    std::unique_lock<std::mutex> threads(_threads);
    for (;;) {
        if (const platform::OsError error = _file.lock())
            ZRJSONCONFIG_FAILURE(kOsFault).usage(kUsageTypeFilePath, _path).comment("Failed to lock file").osError(error).raise();
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
        if (error.code == EFBIG) failure.comment("The file is larger than 16 MiB");
        failure.raise();
    }
    return text;
}

void LockableFile::write(const std::string& text) {
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

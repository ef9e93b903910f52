// The configuration file "tiktal.config" in the driver's data directory, shared by every process
// on the machine, and its lock.
#pragma once

#include <chrono>
#include <cstddef>
#include <mutex>
#include <string>

#include "platform/platform.h"

namespace zrjsonconfig {

// The path of the configuration file: "tiktal.config" in the data directory.
std::string configFilePath();

// One open configuration file. Reading, changing and writing it under lock() is one step for all
// processes: lock() enters a lock of this object (threads sharing it) and then takes the
// exclusive lock over the whole file (other processes, and other LockableFile objects of this
// process), waiting at most kLockWait.
//
// write() never leaves a partial file: the new text replaces the file at once (it is written
// into a new file beside it, which is renamed over it), so a process killed while writing
// leaves the old content. The file object and its lock move to the new file. A path that is a
// link keeps the link: the file at its end is replaced. Where the process may not make files in
// that folder, the file is rewritten in place under its lock instead (see platform::File).
//
// Failures raise the status exception with the translator details (config/failure.h), which
// always name the file's path.
class LockableFile {
public:
    // A file larger than this is refused when read: the configuration of a machine's devices is
    // a few kilobytes, and a file of this size is no configuration file.
    static constexpr std::size_t kMaxSize = 16 * 1024 * 1024;
    // How long lock() waits for other processes, as long as a request waits for the driver.
    static constexpr std::chrono::seconds kLockWait{30};

    // Opens `path`; when it is missing and `createIfMissing`, creates it empty, and the folders
    // on the way to it. Fails with -52006.
    LockableFile(std::string path, bool createIfMissing);
    // Releases the lock, if held, and closes the file.
    ~LockableFile();
    LockableFile(const LockableFile&) = delete;
    LockableFile& operator=(const LockableFile&) = delete;

    // Waits for the lock, at most `limit` in all. A file that another process replaced (or
    // removed) while this one waited is opened again at the path and locked again, so that the
    // lock always guards the file the path names. Fails with -52007 when other processes held a
    // lock on the file (shared or exclusive) all that time, else with -52008 (or -52006 when the
    // file cannot be opened again).
    void lock(std::chrono::milliseconds limit = kLockWait);
    // Releases the lock taken by lock() on this thread (lock() is not re-entrant). Fails with
    // -52008.
    void unlock();

    // The whole text of the file; call it with the lock held. Fails with -52012.
    std::string read();
    // Replaces the text of the file; call it with the lock held, which it keeps. Fails with
    // -52012 ("Failed to write file", or "Failed to flush file" when the data did not reach
    // the disk); a text larger than kMaxSize, which read() would refuse, is not written.
    void write(const std::string& text);

    const std::string& path() const noexcept { return _path; }

private:
    void open();

    std::string _path;
    bool _create;
    platform::File _file;
    std::mutex _threads;
    bool _locked = false;  // by the thread in lock() or holding it
};

}  // namespace zrjsonconfig

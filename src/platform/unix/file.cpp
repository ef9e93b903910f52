// The configuration file: open-file-description locks and the crash-safe replace.
#include "platform/platform.h"
#include "platform/common.h"
#include "platform/unix/unix.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstdlib>

namespace platform {

namespace {

// Waiters for a file's lock each hold a shared lock on this byte, far beyond any content, so that
// a newcomer sees them and waits in line with them rather than taking the lock the moment it is
// free: a process that loads in a loop would otherwise take it again each time before any
// waiter's next try, for good.
constexpr off_t kWaitersByte = off_t{1} << 62;

// Sets or clears a lock on `length` bytes from `start` (length 0: to the end, however the file
// grows) without waiting: EAGAIN when another open file holds a lock in the way.
OsError setLock(int descriptor, short type, off_t start, off_t length) noexcept {
    struct flock range {};
    range.l_type = type;
    range.l_whence = SEEK_SET;
    range.l_start = start;
    range.l_len = length;
    while (::fcntl(descriptor, F_OFD_SETLK, &range) != 0) {
        if (errno == EACCES) return {"fcntl", EAGAIN};  // the other answer POSIX allows for a conflict
        if (errno != EINTR) return {"fcntl", errno};
    }
    return {};
}

// The file's lock: everything before the waiters' byte (every byte of any real content).
OsError setFileLock(int descriptor, short type) noexcept { return setLock(descriptor, type, 0, kWaitersByte); }

// Whether another open file holds a lock on the waiters' byte: someone is waiting for the lock
// (or holds a lock over the whole file, which is just as much in the way).
bool othersWait(int descriptor) noexcept {
    struct flock range {};
    range.l_type = F_WRLCK;
    range.l_whence = SEEK_SET;
    range.l_start = kWaitersByte;
    range.l_len = 1;
    return ::fcntl(descriptor, F_OFD_GETLK, &range) == 0 && range.l_type != F_UNLCK;
}

// Writes the whole of `data` from the start of the file.
OsError writeAll(int descriptor, const char* data, std::size_t size) noexcept {
    for (off_t offset = 0; size > 0;) {
        const ssize_t written = ::pwrite(descriptor, data, size, offset);
        if (written < 0 && errno == EINTR) continue;
        if (written < 0) return {"write", errno};
        data += written;
        offset += written;
        size -= static_cast<std::size_t>(written);
    }
    return {};
}

OsError syncFolder(const std::string& folder) noexcept {
    const int descriptor = ::open(folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (descriptor < 0) return {"open", errno};
    OsError error;
    if (::fsync(descriptor) != 0) error = {"fsync", errno};
    ::close(descriptor);
    return error;
}


}  // namespace

File::~File() { close(); }

OsError File::open(const std::string& path, bool create) {
    close();
    // Without O_EXCL, opening and creating are one step: of several processes that find the file
    // missing at once, one creates it and the others open what it created. A link that leads
    // nowhere is followed too: the file is created where the link points, as every later write
    // rewrites the link's target and leaves the link. O_NONBLOCK: a device or a pipe put in the
    // file's place must not hold the opener up before it is refused.
    const int descriptor =
        ::open(path.c_str(), O_RDWR | O_CLOEXEC | O_NOCTTY | O_NONBLOCK | (create ? O_CREAT : 0), 0666);
    if (descriptor < 0) return {"open", errno};
    struct stat status {};
    OsError error;
    if (::fstat(descriptor, &status) != 0) error = {"fstat", errno};
    else if (!S_ISREG(status.st_mode)) error = {"open", EINVAL};
    if (error) {
        ::close(descriptor);
        return error;
    }
    _descriptor = descriptor;
    _path = path;
    return {};
}

void File::close() noexcept {
    if (_descriptor >= 0) ::close(_descriptor);
    _descriptor = -1;
    _locked = false;
}

// Tried again after short pauses rather than waited for in the kernel, whose wait only a signal
// could end before the lock is free.
OsError File::lock(std::chrono::milliseconds limit) noexcept {
    const OsError error = lockInTurn(
        limit, {"fcntl", EAGAIN}, othersWait(_descriptor), [&] { return setFileLock(_descriptor, F_WRLCK); },
        [&](bool join) { (void)setLock(_descriptor, join ? F_RDLCK : F_UNLCK, kWaitersByte, 1); });
    if (!error) _locked = true;
    return error;
}

OsError File::unlock() noexcept {
    const OsError error = setFileLock(_descriptor, F_UNLCK);
    if (!error) _locked = false;
    return error;
}

OsError File::namesPath(bool& same) noexcept {
    same = false;
    struct stat opened {}, named {};
    if (::fstat(_descriptor, &opened) != 0) return {"fstat", errno};
    if (::stat(_path.c_str(), &named) != 0) {
        if (errno == ENOENT) return {};  // removed: the path names no file at all
        return {"stat", errno};
    }
    same = opened.st_dev == named.st_dev && opened.st_ino == named.st_ino;
    return {};
}

OsError File::readAll(std::size_t limit, std::string& text) {
    if (const int error = readWhole(_descriptor, limit, text)) return {"pread", error};
    return {};
}

namespace {

// The file `path` names, every link followed, on the way and at the end.
OsError realPath(const std::string& path, std::string& real) {
    const std::unique_ptr<char, void (*)(void*)> resolved(::realpath(path.c_str(), nullptr), std::free);
    if (!resolved) return {"realpath", errno};
    real = resolved.get();
    return {};
}

// Whether a failure to make or rename a file in a folder says that this process may not change
// the folder's entries (EPERM: in a folder with the sticky bit, the file belongs to another user).
bool mayNotChangeFolder(int error) noexcept { return error == EACCES || error == EPERM; }

// Gives the new file the owner, group and mode of the old one. A process that may not give a file
// away (EPERM), or cannot name the old owner in its user namespace (EINVAL), keeps the file as its
// own. The mode comes last: changing the owner clears the set-user and set-group bits.
OsError takeOver(int descriptor, const struct stat& old) noexcept {
    if (::fchown(descriptor, old.st_uid, old.st_gid) != 0 && errno != EPERM && errno != EINVAL) return {"fchown", errno};
    if (::fchmod(descriptor, old.st_mode & 07777) != 0) return {"fchmod", errno};
    return {};
}

}  // namespace

OsError File::replace(const std::string& text) {
    std::string real;
    if (OsError error = realPath(_path, real)) return error;
    const std::size_t slash = real.rfind('/');  // a real path is absolute
    const std::string folder = slash == 0 ? "/" : real.substr(0, slash);
    const std::string name = real.substr(slash + 1);
    if (_locked) removeLeftovers(folder, name);
    // A hidden name of its own in the same folder: a rename within one file system is atomic.
    std::string temporary = folder + "/." + name + ".XXXXXX";
    const int descriptor = ::mkostemp(temporary.data(), O_CLOEXEC);
    if (descriptor < 0) return mayNotChangeFolder(errno) ? rewriteInPlace(text) : OsError{"mkostemp", errno};
    auto fail = [&](OsError error) {
        ::close(descriptor);
        ::unlink(temporary.c_str());
        return error;
    };
    struct stat old {};
    if (::fstat(_descriptor, &old) != 0) return fail({"fstat", errno});
    if (OsError error = takeOver(descriptor, old)) return fail(error);
    if (_locked) {
        if (OsError error = setFileLock(descriptor, F_WRLCK)) return fail(error);
    }
    if (OsError error = writeAll(descriptor, text.data(), text.size())) return fail(error);
    if (::fsync(descriptor) != 0) return fail({"fsync", errno});
    if (::rename(temporary.c_str(), real.c_str()) != 0) {
        const OsError error = fail({"rename", errno});
        return mayNotChangeFolder(error.code) ? rewriteInPlace(text) : error;
    }
    // The path names the new file now; closing the old one ends its lock, and a process that was
    // waiting for it finds that the path names another file.
    const bool locked = _locked;
    close();
    _descriptor = descriptor;
    _locked = locked;
    return syncFolder(folder);
}

OsError File::rewriteInPlace(const std::string& text) noexcept {
    if (OsError error = writeAll(_descriptor, text.data(), text.size())) return error;
    if (::ftruncate(_descriptor, static_cast<off_t>(text.size())) != 0) return {"ftruncate", errno};
    if (::fsync(_descriptor) != 0) return {"fsync", errno};
    return {};
}

}  // namespace platform

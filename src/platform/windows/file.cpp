// The configuration file: byte-range locks (LockFileEx) and the crash-safe replace.
#include "platform/platform.h"
#include "platform/common.h"
#include "platform/windows/windows.h"

#include <algorithm>
#include <chrono>
#include <random>

namespace platform {
namespace {

constexpr DWORD kShareAll = FILE_SHARE_READ | FILE_SHARE_WRITE | FILE_SHARE_DELETE;

// Waiters for a file's lock each hold a shared lock on this byte, far beyond any content, so that
// a newcomer sees them and waits in line with them rather than taking the lock the moment it is
// free (see the Unix backend).
constexpr ULONGLONG kWaitersByte = 1ULL << 62;

OVERLAPPED at(ULONGLONG offset) {
    OVERLAPPED position{};
    position.Offset = static_cast<DWORD>(offset);
    position.OffsetHigh = static_cast<DWORD>(offset >> 32);
    return position;
}

// Takes a lock on `length` bytes from `start` without waiting: ERROR_LOCK_VIOLATION when another
// handle holds a lock in the way.
OsError setLock(HANDLE file, bool exclusive, ULONGLONG start, ULONGLONG length) noexcept {
    OVERLAPPED position = at(start);
    const DWORD flags = LOCKFILE_FAIL_IMMEDIATELY | (exclusive ? LOCKFILE_EXCLUSIVE_LOCK : 0);
    if (!LockFileEx(file, flags, 0, static_cast<DWORD>(length), static_cast<DWORD>(length >> 32), &position))
        return {"LockFileEx", static_cast<int>(GetLastError())};
    return {};
}

OsError clearLock(HANDLE file, ULONGLONG start, ULONGLONG length) noexcept {
    OVERLAPPED position = at(start);
    if (!UnlockFileEx(file, 0, static_cast<DWORD>(length), static_cast<DWORD>(length >> 32), &position))
        return {"UnlockFileEx", static_cast<int>(GetLastError())};
    return {};
}

// The file's lock: everything before the waiters' byte (every byte of any real content).
OsError setFileLock(HANDLE file) noexcept { return setLock(file, true, 0, kWaitersByte); }

// Whether another handle holds a lock on the waiters' byte: someone waits for the lock.
bool othersWait(HANDLE file) noexcept {
    if (setLock(file, true, kWaitersByte, 1)) return true;
    clearLock(file, kWaitersByte, 1);
    return false;
}


OsError writeAll(HANDLE file, const char* data, std::size_t size) noexcept {
    for (ULONGLONG offset = 0; size > 0;) {
        OVERLAPPED position = at(offset);
        DWORD written = 0;
        const DWORD chunk = static_cast<DWORD>(std::min<std::size_t>(size, 1u << 30));
        if (!WriteFile(file, data, chunk, &written, &position)) return {"WriteFile", static_cast<int>(GetLastError())};
        data += written;
        offset += written;
        size -= written;
    }
    return {};
}

OsError identityOf(HANDLE file, BY_HANDLE_FILE_INFORMATION& information) noexcept {
    if (!GetFileInformationByHandle(file, &information))
        return {"GetFileInformationByHandle", static_cast<int>(GetLastError())};
    return {};
}


// A new file of a hidden name of its own ("." + name + "." and six characters) in `folder`.
HANDLE createTemporary(const std::string& folder, const std::string& name, std::string& path, DWORD& error) {
    static constexpr char kLetters[] = "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789";
    thread_local std::minstd_rand draw(GetCurrentThreadId() ^ GetTickCount());
    for (int attempt = 0; attempt < 100; ++attempt) {
        path = folder + "\\." + name + ".";
        for (int i = 0; i < 6; ++i) path += kLetters[draw() % (sizeof kLetters - 1)];
        const HANDLE file = CreateFileA(path.c_str(), GENERIC_READ | GENERIC_WRITE | DELETE, kShareAll, nullptr,
                                        CREATE_NEW, FILE_ATTRIBUTE_HIDDEN, nullptr);
        if (file != INVALID_HANDLE_VALUE) return file;
        error = GetLastError();
        if (error != ERROR_FILE_EXISTS) return INVALID_HANDLE_VALUE;
    }
    return INVALID_HANDLE_VALUE;
}

// Whether a failure to make or rename a file in a folder says that this process may not change
// the folder's entries, or that another process holds the file in a way that forbids the rename.
bool mayNotReplace(DWORD error) noexcept { return error == ERROR_ACCESS_DENIED || error == ERROR_SHARING_VIOLATION; }

// Whether every folder on the way to `path` that exists is a folder: then ERROR_PATH_NOT_FOUND
// means that one is missing, which other systems tell apart from a file in the way.
bool onlyFoldersOnTheWay(const std::string& path) {
    for (std::size_t end = path.find_first_of("/\\"); end != std::string::npos; end = path.find_first_of("/\\", end + 1)) {
        const DWORD attributes = GetFileAttributesA(path.substr(0, end).c_str());
        if (attributes != INVALID_FILE_ATTRIBUTES && !(attributes & FILE_ATTRIBUTE_DIRECTORY)) return false;
    }
    return true;
}

}  // namespace

File::~File() { close(); }

// Every handle shares reading, writing and deleting: a writer's rename must never be refused
// because another process has the file open.
OsError File::open(const std::string& path, bool create) {
    close();
    const HANDLE file = CreateFileA(path.c_str(), GENERIC_READ | GENERIC_WRITE, kShareAll, nullptr,
                                    create ? OPEN_ALWAYS : OPEN_EXISTING, FILE_ATTRIBUTE_NORMAL, nullptr);
    if (file == INVALID_HANDLE_VALUE) {
        const DWORD error = GetLastError();
        const DWORD attributes = GetFileAttributesA(path.c_str());
        if (attributes != INVALID_FILE_ATTRIBUTES && (attributes & FILE_ATTRIBUTE_DIRECTORY))
            return {"CreateFileA", error::kIsAFolder};
        if (error == ERROR_PATH_NOT_FOUND && onlyFoldersOnTheWay(path)) return {"CreateFileA", error::kNotFound};
        return {"CreateFileA", static_cast<int>(error)};
    }
    if (GetFileType(file) != FILE_TYPE_DISK) {
        CloseHandle(file);
        return {"CreateFileA", error::kInvalid};
    }
    _descriptor = descriptorOf(file);
    _path = path;
    return {};
}

void File::close() noexcept {
    if (_descriptor >= 0) {
        // Locks end with the handle, but not always at once: they are let go first.
        if (_locked) clearLock(handleOf(_descriptor), 0, kWaitersByte);
        CloseHandle(handleOf(_descriptor));
    }
    _descriptor = -1;
    _locked = false;
}

OsError File::lock(std::chrono::milliseconds limit) noexcept {
    const HANDLE file = handleOf(_descriptor);
    const OsError error = lockInTurn(
        limit, {"LockFileEx", ERROR_LOCK_VIOLATION}, othersWait(file), [&] { return setFileLock(file); },
        [&](bool join) {
            if (join)
                (void)setLock(file, false, kWaitersByte, 1);
            else
                (void)clearLock(file, kWaitersByte, 1);
        });
    if (!error) _locked = true;
    return error;
}

OsError File::unlock() noexcept {
    const OsError error = clearLock(handleOf(_descriptor), 0, kWaitersByte);
    if (!error) _locked = false;
    return error;
}

OsError File::namesPath(bool& same) noexcept {
    same = false;
    BY_HANDLE_FILE_INFORMATION opened{}, named{};
    if (OsError error = identityOf(handleOf(_descriptor), opened)) return error;
    const HANDLE file =
        CreateFileA(_path.c_str(), 0, kShareAll, nullptr, OPEN_EXISTING, FILE_FLAG_BACKUP_SEMANTICS, nullptr);
    if (file == INVALID_HANDLE_VALUE) {
        const DWORD error = GetLastError();
        if (error == ERROR_FILE_NOT_FOUND) return {};  // removed: the path names no file at all
        return {"CreateFileA", static_cast<int>(error)};
    }
    const OsError error = identityOf(file, named);
    CloseHandle(file);
    same = !error && opened.dwVolumeSerialNumber == named.dwVolumeSerialNumber &&
           opened.nFileIndexHigh == named.nFileIndexHigh && opened.nFileIndexLow == named.nFileIndexLow;
    return error;
}

OsError File::readAll(std::size_t limit, std::string& text) {
    if (const int error = readWhole(handleOf(_descriptor), limit, text)) return {"ReadFile", error};
    return {};
}

// The new file is written and flushed under a name of its own, then renamed over the old one
// with the rename written through to the disk.
OsError File::replace(const std::string& text) {
    const std::size_t slash = _path.find_last_of("/\\");
    const std::string folder = slash == std::string::npos ? "." : _path.substr(0, slash);
    const std::string name = _path.substr(slash + 1);
    if (_locked) removeLeftovers(folder, name);
    std::string temporary;
    DWORD failed = 0;
    const HANDLE file = createTemporary(folder, name, temporary, failed);
    if (file == INVALID_HANDLE_VALUE)
        return mayNotReplace(failed) ? rewriteInPlace(text) : OsError{"CreateFileA", static_cast<int>(failed)};
    auto fail = [&](OsError error) {
        CloseHandle(file);
        DeleteFileA(temporary.c_str());
        return error;
    };
    if (_locked) {
        if (OsError error = setFileLock(file)) return fail(error);
    }
    if (OsError error = writeAll(file, text.data(), text.size())) return fail(error);
    if (!FlushFileBuffers(file)) return fail({"FlushFileBuffers", static_cast<int>(GetLastError())});
    if (!MoveFileExA(temporary.c_str(), _path.c_str(), MOVEFILE_REPLACE_EXISTING | MOVEFILE_WRITE_THROUGH)) {
        const OsError error = fail({"MoveFileExA", static_cast<int>(GetLastError())});
        return mayNotReplace(static_cast<DWORD>(error.code)) ? rewriteInPlace(text) : error;
    }
    // The path names the new file now; letting the old one go ends its lock, and a process that
    // was waiting for it finds that the path names another file.
    const bool locked = _locked;
    close();
    _descriptor = descriptorOf(file);
    _locked = locked;
    return {};
}

OsError File::rewriteInPlace(const std::string& text) noexcept {
    const HANDLE file = handleOf(_descriptor);
    if (OsError error = writeAll(file, text.data(), text.size())) return error;
    LARGE_INTEGER end{};
    end.QuadPart = static_cast<LONGLONG>(text.size());
    if (!SetFilePointerEx(file, end, nullptr, FILE_BEGIN) || !SetEndOfFile(file))
        return {"SetEndOfFile", static_cast<int>(GetLastError())};
    if (!FlushFileBuffers(file)) return {"FlushFileBuffers", static_cast<int>(GetLastError())};
    return {};
}

}  // namespace platform

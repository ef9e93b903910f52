// The operating-system facilities the library uses. Each system has a folder of its own with one
// file per facility (unix/, windows/); nothing outside this folder includes a system header for
// them.
#pragma once

#include <cerrno>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <memory>
#include <string>
#include <vector>

namespace platform {

// A lock that must be initialized before use; initialization can fail for lack of memory.
class Mutex {
public:
    Mutex() noexcept = default;
    Mutex(const Mutex&) = delete;
    Mutex& operator=(const Mutex&) = delete;

    // 0 on success, else the platform status (-52000 when the system has no memory for it).
    std::int32_t init() noexcept;
    void destroy() noexcept;
    void lock() noexcept;
    void unlock() noexcept;

private:
    alignas(16) unsigned char _storage[64];
};

class LockGuard {
public:
    explicit LockGuard(Mutex& mutex) noexcept : _mutex(mutex) { _mutex.lock(); }
    ~LockGuard() { _mutex.unlock(); }
    LockGuard(const LockGuard&) = delete;
    LockGuard& operator=(const LockGuard&) = delete;

private:
    Mutex& _mutex;
};

// Hands one whole line to the debug output; lines of concurrent writers never mix.
void writeDebugOutput(const char* line, std::size_t length) noexcept;

// Shared libraries loaded at run time. Failures return null and describe themselves in `error`,
// the text of the system call named by kLoadLibraryApi or kFindSymbolApi.
#if defined(_WIN32)
constexpr char kLoadLibraryApi[] = "LoadLibraryExA";
constexpr char kFindSymbolApi[] = "GetProcAddress";
#else
constexpr char kLoadLibraryApi[] = "dlerror";
constexpr char kFindSymbolApi[] = "dlerror";
#endif
void* loadLibrary(const std::string& path, std::string& error);
void* findSymbol(void* library, const char* name, std::string& error);
void unloadLibrary(void* library) noexcept;
// The definition of the function `name` in another object than the driver library itself: the
// first after it in the lookup order, else the first before it. Null when there is none.
void* findDefinitionBeyond(const char* name) noexcept;
// The file name of the library `stem` on this system ("libstem.so").
std::string libraryFileName(const std::string& stem);

// The shared installation directory that holds the run-time libraries: $ZRSHAREDDIR when set,
// else the directory chosen when the library was configured.
std::string sharedDirectory();

struct OsError;

// One device interface of the timing module's driver class: an entry of
// $TIKTAL_SYSROOT/sys/class/tiktal, whose "device" link leads to the PCI device's folder.
struct DeviceInterfaceEntry {
    std::string name;         // the entry's name
    std::string classFolder;  // the entry itself: device properties
    std::string pciFolder;    // the resolved PCI device folder: bus properties
    std::string interfacePath;  // $TIKTAL_SYSROOT/dev/<name>
    // The PCI functions from the root down to the device ("DDDD:BB:DD.F" each) and the position of
    // the root's pciDDDD:BB folder among the sorted pci* folders of sys/devices.
    std::vector<std::string> pciPath;
    int rootIndex = 0;
};

// The device interfaces present now, sorted by name. An entry that is not a folder (a stray file)
// is no device interface and is passed over, as is one that goes away while the folder is read.
// On failure, the call that failed, with `failedPath` the path it was given.
OsError enumerateDeviceInterfaces(std::vector<DeviceInterfaceEntry>& entries, std::string& failedPath) noexcept;
// The text of a small attribute file (at most 4 KiB, else error::kBufferTooSmall), without its trailing line
// feed; 0 or the error number (error::kNotFound when no regular file is there, as readRegularFile
// says).
int readAttributeFile(const std::string& path, std::string& text) noexcept;

// Whether something (a file, a folder, a link) is at `path`.
bool exists(const std::string& path) noexcept;

// Modules of the graphical environment's run time. A module handle is what dlopen returns for a
// loaded object (the main program included); none is null.
//
// The module in the calling thread's slot `index`: on this system the index is a pthread_key_t
// that the run time created, whose value in each thread is that thread's module. Null for the
// index 0xFFFFFFFF (none) and for an empty slot.
void* threadModule(std::uint32_t index) noexcept;
// The main program, when it defines one of `names` itself (not through a library it loaded).
void* mainProgramDefining(std::initializer_list<const char*> names) noexcept;
// The library of file name `name` when it is loaded already; nothing is loaded.
void* loadedLibrary(const char* name) noexcept;
// The address of `name` defined in `module` itself, or null.
void* moduleSymbol(void* module, const char* name) noexcept;
// A stamp of the module's file that is the same for every load of that file and never 0.
std::uint32_t moduleStamp(void* module) noexcept;
// Whether `module` is still loaded (the handle is compared, never followed).
bool isModuleLoaded(void* module) noexcept;
// Writes "Fatal Error: " + `text` as one line on standard error and ends the process at once with
// exit status 1 (the process is in no state to run its exit handlers).
[[noreturn]] void fatalError(const std::string& text) noexcept;

// The error numbers of this system that the rest of the library tells apart: errno values on
// Unix, the system error codes of GetLastError on Windows.
namespace error {
#if defined(_WIN32)
constexpr int kNotFound = 2;          // ERROR_FILE_NOT_FOUND
constexpr int kNotAFolder = 3;        // ERROR_PATH_NOT_FOUND: a part of the path is missing or no folder
constexpr int kNoMemory = 8;          // ERROR_NOT_ENOUGH_MEMORY
constexpr int kBufferTooSmall = 122;  // ERROR_INSUFFICIENT_BUFFER
constexpr int kNotSupported = 50;     // ERROR_NOT_SUPPORTED
constexpr int kInvalid = 87;          // ERROR_INVALID_PARAMETER
constexpr int kFileTooLarge = 223;    // ERROR_FILE_TOO_LARGE
constexpr int kTimedOut = 258;        // WAIT_TIMEOUT
constexpr int kIsAFolder = 267;       // ERROR_DIRECTORY
constexpr int kCancelled = 995;       // ERROR_OPERATION_ABORTED
constexpr int kLinkLoop = 1921;       // ERROR_CANT_RESOLVE_FILENAME
#else
constexpr int kNotFound = ENOENT;
constexpr int kNotAFolder = ENOTDIR;
constexpr int kNoMemory = ENOMEM;
constexpr int kBufferTooSmall = EOVERFLOW;
constexpr int kNotSupported = EOPNOTSUPP;
constexpr int kInvalid = EINVAL;
constexpr int kFileTooLarge = EFBIG;
constexpr int kTimedOut = ETIMEDOUT;
constexpr int kIsAFolder = EISDIR;
constexpr int kCancelled = ECANCELED;
constexpr int kLinkLoop = ELOOP;
#endif
}  // namespace error

// The platform status of an operating-system error number (0 for 0).
std::int32_t statusOfOsError(int error) noexcept;

// A system call that failed: its name and the error number it gave. `api` is null and `code` 0
// when nothing failed.
struct OsError {
    const char* api = nullptr;
    int code = 0;
    explicit operator bool() const noexcept { return code != 0; }
};

// The system's message text of an error number.
std::string osErrorText(int error);

// The target that the symbolic link `path` names, as the link holds it; EINVAL when `path` is no
// link.
OsError readLink(const std::string& path, std::string& target);

// One entry of a folder: its name, and whether the entry itself is a regular file (a symbolic
// link is not followed, so it never counts as one).
struct DirectoryEntry {
    std::string name;
    bool regularFile = false;
};

// The entries of the folder `path`, without "." and "..", sorted by name in byte order, so that
// every file system gives the same order. 0, or the error number (error::kNotFound for a missing folder).
int listDirectory(const std::string& path, std::vector<DirectoryEntry>& entries) noexcept;

// The whole content of the regular file at `path`; a symbolic link is not followed. error::kNotFound
// when no regular file is there (nothing, a link, a folder, a device), error::kFileTooLarge when the file is longer
// than `limit` bytes (nothing is kept), else the error number of the call that failed.
OsError readRegularFile(const std::string& path, std::size_t limit, std::string& text) noexcept;

// The driver's data directory: $TIKTAL_SYSROOT/var/lib/Korvane/tiktal.
std::string dataDirectory();
// Creates the folder `path` and the missing folders on the way to it (the umask applies to
// mode 0777); folders that exist already are no failure.
OsError makeDirectories(const std::string& path);

// A file opened for reading and writing, with an exclusive lock over the whole file that other
// processes and other opens of the same file in this process wait for (an open-file-description
// lock: it belongs to this open file and ends when the file is closed). A child forked while the
// file is open shares the open file, and so keeps the lock alive until it closes its copy too.
class File {
public:
    File() noexcept = default;
    ~File();
    File(const File&) = delete;
    File& operator=(const File&) = delete;

    // Opens `path`, links followed; when it is missing and `create`, creates it empty (at the
    // end of a link that leads nowhere: where the link points, when that folder exists). Only a
    // regular file is opened: anything else at the path fails with EINVAL (EISDIR for a folder).
    OsError open(const std::string& path, bool create);
    // Closes the file; its lock, if held, ends with it.
    void close() noexcept;
    bool isOpen() const noexcept { return _descriptor >= 0; }
    const std::string& path() const noexcept { return _path; }

    // Waits until this open file holds the exclusive lock, at most `limit`: ETIMEDOUT when other
    // open files held a lock on it (shared or exclusive) all that time. Waiters take turns: one
    // that comes while others wait waits behind them, so no one holding and taking the lock
    // again at once keeps it from them for good.
    OsError lock(std::chrono::milliseconds limit) noexcept;
    OsError unlock() noexcept;

    // Whether the path still names this open file (same device and inode). A file replaced or
    // removed since it was opened does not: a lock on it no longer guards the file at the path.
    OsError namesPath(bool& same) noexcept;

    // The whole content from its start. A file longer than `limit` bytes is not read: EFBIG.
    OsError readAll(std::size_t limit, std::string& text);

    // Replaces the file the path names (at the end of its links: a link stays a link) with `text`
    // so that every reader finds either the old or the new content, never a part: the text goes
    // into a new file in the same folder as that file, which gets its owner and group (where the
    // process may give them) and its mode, is synced and renamed over it; then the folder is
    // synced. This object then holds the new file, locked when the old one was (the lock is taken
    // before the rename, so no other process can take it in between). On a failure before the
    // rename the old file stays as it was. With the lock held it first removes the new files that
    // killed writers left behind.
    // A process that may write the file but not make or rename files in its folder rewrites it in
    // place instead (written, cut to the new length, synced): readers that take the lock never
    // see a part of it, but a process killed while writing leaves a part.
    OsError replace(const std::string& text);

private:
    OsError rewriteInPlace(const std::string& text) noexcept;

    int _descriptor = -1;
    bool _locked = false;
    std::string _path;
};

// A connection to a device's driver at its interface path. On Linux the driver is a daemon on a
// Unix seqpacket socket: a request is one message (u32 control code, u32 output room, the input
// packet), its answer one message (i32 error number, u32 bytes returned, the output bytes).
class DeviceChannel {
public:
    DeviceChannel();
    ~DeviceChannel();
    DeviceChannel(const DeviceChannel&) = delete;
    DeviceChannel& operator=(const DeviceChannel&) = delete;

    // 0, or the error number of the failure.
    int open(const std::string& path) noexcept;
    void close() noexcept;
    bool isOpen() const noexcept;
    const std::string& path() const noexcept;
    // One request and its answer; requests of several threads each get their own answer. 0, or
    // the error number the driver answered or the transport met; `returned` is the output size.
    int control(std::uint32_t code, const void* in, std::uint32_t inSize, void* out, std::uint32_t outSize,
                std::uint32_t& returned) noexcept;

private:
    struct State;
    std::unique_ptr<State> _state;
};

// Decodes one answer message of a driver (i32 error number, u32 bytes returned, the output), of
// which `received` bytes arrived (more than the room of 8 + `outSize` bytes when it was cut):
// 0 or the driver's error number, with the output copied into `out` and its size in `returned`;
// EPROTO for a malformed message and EBADMSG for a pending answer, with nothing copied.
int decodeDriverAnswer(const std::uint8_t* message, std::size_t received, void* out, std::uint32_t outSize,
                       std::uint32_t& returned) noexcept;

// One driver wait, on a connection of its own: armed by one request whose first answer carries
// the wait identifier; the second answer comes when the condition occurs or the wait is cancelled.
class DeviceWait {
public:
    DeviceWait() noexcept = default;
    ~DeviceWait();
    DeviceWait(const DeviceWait&) = delete;
    DeviceWait& operator=(const DeviceWait&) = delete;

    // Sends the wait request; 0 with the identifier (0: not armed), or the error number.
    int arm(const std::string& path, std::uint32_t code, const void* in, std::uint32_t inSize,
            std::uint64_t& identifier) noexcept;
    // Blocks until the wait ends; 0, or the error number (the connection lost among them).
    int awaitEnd() noexcept;
    // Ends a blocked awaitEnd at once (its connection is shut).
    void abandon() noexcept;

private:
    int _socket = -1;
};

}  // namespace platform

// Linux backend of the platform layer.
#include "platform/platform.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/time.h>
#include <sys/un.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <dlfcn.h>
#include <link.h>
#include <fcntl.h>
#include <mutex>
#include <new>
#include <algorithm>
#include <climits>
#include <functional>
#include <pthread.h>
#include <random>
#include <thread>
#include <unistd.h>
#include <vector>

namespace platform {
namespace {

constexpr std::int32_t kOutOfMemory = -52000;
// Any other failure to create a lock: the platform layer's internal error.
constexpr std::int32_t kInternalError = -52003;

pthread_mutex_t* native(unsigned char* storage) { return std::launder(reinterpret_cast<pthread_mutex_t*>(storage)); }

}  // namespace

static_assert(sizeof(pthread_mutex_t) <= 64, "Mutex storage too small");

std::int32_t Mutex::init() noexcept {
    const int error = pthread_mutex_init(new (_storage) pthread_mutex_t, nullptr);
    if (error == 0) return 0;
    return error == ENOMEM ? kOutOfMemory : kInternalError;
}

void Mutex::destroy() noexcept { pthread_mutex_destroy(native(_storage)); }
void Mutex::lock() noexcept { pthread_mutex_lock(native(_storage)); }
void Mutex::unlock() noexcept { pthread_mutex_unlock(native(_storage)); }

// One write(2) per line: the kernel does not split a pipe write of up to PIPE_BUF bytes, and
// trace lines are shorter than that.
void writeDebugOutput(const char* line, std::size_t length) noexcept {
    while (length > 0) {
        const ssize_t written = ::write(STDERR_FILENO, line, length);
        if (written < 0 && errno == EINTR) continue;
        if (written <= 0) return;
        line += written;
        length -= static_cast<std::size_t>(written);
    }
}

namespace {

std::string dlerrorText() {
    const char* text = dlerror();
    return text ? text : "unknown dynamic loader error";
}

}  // namespace

void* loadLibrary(const std::string& path, std::string& error) {
    void* library = dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (!library) error = dlerrorText();
    return library;
}

void* findSymbol(void* library, const char* name, std::string& error) {
    dlerror();
    void* symbol = dlsym(library, name);
    if (!symbol) error = dlerrorText();
    return symbol;
}

void unloadLibrary(void* library) noexcept {
    if (library) dlclose(library);
}

void* findDefinitionBeyond(const char* name) noexcept {
    if (void* next = dlsym(RTLD_NEXT, name)) return next;
    void* first = dlsym(RTLD_DEFAULT, name);
    Dl_info own{}, found{};
    // The first definition may be the driver library's own: that is no definition beyond it.
    if (!first || !dladdr(reinterpret_cast<void*>(&findDefinitionBeyond), &own) || !dladdr(first, &found) ||
        own.dli_fbase == found.dli_fbase)
        return nullptr;
    return first;
}

std::string libraryFileName(const std::string& stem) { return "lib" + stem + ".so"; }

std::string sharedDirectory() {
    const char* configured = std::getenv("ZRSHAREDDIR");
    return configured && *configured ? configured : TIKTAL_DEFAULT_SHARED_DIR;
}

// Operating-system errors and the platform statuses they stand for; the Windows errors of the same
// meaning, which the statuses were first defined for, are named beside each row.
namespace {

struct OsErrorRow {
    int error;
    std::int32_t status;
};

constexpr OsErrorRow kOsErrors[] = {
    {EINPROGRESS, 52011}, {EAGAIN, 52011},                              // 997 I/O pending (a warning)
    {ENOMEM, -52000},     {ENOBUFS, -52000},                            // 8, 1450 no memory or resources
    {EOPNOTSUPP, -52002}, {ENOSYS, -52002},   {ENOTTY, -52002},         // 50, 1 not supported
    {ECONNRESET, -52003}, {EPIPE, -52003},    {EIO, -52003},            // 31, 1117 the device does not function
    {ENOTCONN, -52003},
    {EINVAL, -52005},     {ENAMETOOLONG, -52005},                       // 87 invalid parameter
    {ENOENT, -52006},     {ENODEV, -52006},   {ENXIO, -52006},          // 2 no such device
    {ECONNREFUSED, -52006},                                             //   (no driver behind the path)
    {ETIMEDOUT, -52007},                                                // 121, 258 time-out
    {EPROTO, -52008},     {EBADMSG, -52008},                            // 1359 internal error (a malformed answer)
    {EACCES, -52009},     {EPERM, -52009},                              // 5 access denied
    {ENODATA, -52012},                                                  // 38 end of data
    {EEXIST, -52013},                                                   // 183 already exists
    {EMSGSIZE, -52019},   {EOVERFLOW, -52019},                          // 122 buffer too small
    {EBUSY, -52031},                                                    // 170 busy
};

// An error not in the table: the device does not function.
constexpr std::int32_t kUnknownOsError = -52003;

}  // namespace

std::int32_t statusOfOsError(int error) noexcept {
    if (error == 0) return 0;
    for (const OsErrorRow& row : kOsErrors)
        if (row.error == error) return row.status;
    return kUnknownOsError;
}

std::string osErrorText(int error) {
    char buffer[256];
    // The GNU strerror_r returns the text, which may or may not be in the buffer.
    return strerror_r(error, buffer, sizeof buffer);
}

namespace {

// The root of the machine the library sees: empty on a real machine.
std::string sysroot() {
    const char* root = std::getenv("TIKTAL_SYSROOT");
    return root ? root : "";
}

}  // namespace

std::string dataDirectory() { return sysroot() + "/var/lib/Korvane/tiktal"; }

OsError makeDirectories(const std::string& path) {
    // Each folder on the way, from the first below the root; the last is `path` itself.
    for (std::size_t end = path.find('/', 1);; end = path.find('/', end + 1)) {
        const std::string folder = path.substr(0, end);
        if (!folder.empty() && folder.back() != '/' && ::mkdir(folder.c_str(), 0777) != 0 && errno != EEXIST)
            return {"mkdir", errno};
        if (end == std::string::npos) break;
    }
    struct stat status {};
    if (::stat(path.c_str(), &status) != 0) return {"stat", errno};
    if (!S_ISDIR(status.st_mode)) return {"mkdir", ENOTDIR};  // a file of that name is in the way
    return {};
}

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

// A pause between two tries of a waiter: 0.5 to 1.5 ms, drawn anew each time so that no waiter
// keeps a turn that always comes just after the lock is taken again.
std::chrono::microseconds nextLockPause() noexcept {
    thread_local std::minstd_rand draw(static_cast<std::minstd_rand::result_type>(
        std::hash<std::thread::id>{}(std::this_thread::get_id()) ^ static_cast<std::size_t>(::getpid())));
    return std::chrono::microseconds(500 + draw() % 1000);
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
// could end before the lock is free. While others wait, a newcomer does not try at once but
// waits in line with them, each try after a pause of chance length.
OsError File::lock(std::chrono::milliseconds limit) noexcept {
    using Clock = std::chrono::steady_clock;
    const Clock::time_point deadline = Clock::now() + limit;
    OsError error{"fcntl", EAGAIN};
    if (!othersWait(_descriptor)) error = setFileLock(_descriptor, F_WRLCK);
    if (error.code == EAGAIN) {
        // Failing to join the line only means that later comers do not see this waiter.
        (void)setLock(_descriptor, F_RDLCK, kWaitersByte, 1);
        for (Clock::time_point now = Clock::now(); error.code == EAGAIN && now < deadline; now = Clock::now()) {
            std::this_thread::sleep_for(std::min<Clock::duration>(nextLockPause(), deadline - now));
            error = setFileLock(_descriptor, F_WRLCK);
        }
        (void)setLock(_descriptor, F_UNLCK, kWaitersByte, 1);
        if (error.code == EAGAIN) error = {"fcntl", ETIMEDOUT};
    }
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

namespace {

// The whole content of an open file from its start; a file longer than `limit` bytes is not
// read: EFBIG, nothing kept. 0 or the error number.
int readWhole(int descriptor, std::size_t limit, std::string& text) {
    text.clear();
    char block[65536];
    for (off_t offset = 0;;) {
        const ssize_t got = ::pread(descriptor, block, sizeof block, offset);
        if (got < 0 && errno == EINTR) continue;
        if (got < 0) return errno;
        if (got == 0) return 0;
        // Counted before it is kept, so that a file far beyond the limit costs no more memory.
        if (static_cast<std::size_t>(got) > limit - text.size()) {
            text.clear();
            return EFBIG;
        }
        text.append(block, static_cast<std::size_t>(got));
        offset += got;
    }
}

// Whether the entry `name` of the open folder is a regular file, the link itself for a link.
bool isRegularFile(DIR* folder, const dirent* entry) {
    if (entry->d_type != DT_UNKNOWN) return entry->d_type == DT_REG;
    struct stat status {};
    return ::fstatat(::dirfd(folder), entry->d_name, &status, AT_SYMLINK_NOFOLLOW) == 0 && S_ISREG(status.st_mode);
}

int readFolder(DIR* folder, std::vector<DirectoryEntry>& entries) {
    for (;;) {
        errno = 0;
        const dirent* entry = ::readdir(folder);
        if (!entry) return errno;
        if (std::strcmp(entry->d_name, ".") != 0 && std::strcmp(entry->d_name, "..") != 0)
            entries.push_back({entry->d_name, isRegularFile(folder, entry)});
    }
}

}  // namespace

int listDirectory(const std::string& path, std::vector<DirectoryEntry>& entries) noexcept {
    entries.clear();
    DIR* folder = ::opendir(path.c_str());
    if (!folder) return errno;
    int error = 0;
    try {
        error = readFolder(folder, entries);
        std::sort(entries.begin(), entries.end(),
                  [](const DirectoryEntry& a, const DirectoryEntry& b) { return a.name < b.name; });
    } catch (const std::bad_alloc&) {
        error = ENOMEM;
    }
    ::closedir(folder);
    if (error) entries.clear();
    return error;
}

OsError readRegularFile(const std::string& path, std::size_t limit, std::string& text) noexcept {
    text.clear();
    // Without blocking: a pipe or a terminal put in the file's place must not hold the reader up
    // before it is refused.
    const int file = ::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY);
    if (file < 0) return {"open", errno == ELOOP ? ENOENT : errno};  // ELOOP: the path is a link
    OsError error;
    struct stat status {};
    if (::fstat(file, &status) != 0) {
        error = {"fstat", errno};
    } else if (!S_ISREG(status.st_mode)) {
        error = {"open", ENOENT};
    } else {
        try {
            if (const int failed = readWhole(file, limit, text)) error = {"pread", failed};
        } catch (const std::bad_alloc&) {
            error = {"pread", ENOMEM};
        }
    }
    ::close(file);
    return error;
}

namespace {

// The names in a folder, sorted, without "." and ".."; 0 or the error number.
int listFolder(const std::string& path, std::vector<std::string>& names) {
    std::vector<DirectoryEntry> entries;
    const int error = listDirectory(path, entries);
    names.clear();
    for (DirectoryEntry& entry : entries) names.push_back(std::move(entry.name));
    return error;
}

// Removes the temporary files that writers of `name` in `folder` left when they were killed before
// their rename ("." + name + "." and six characters, as replace() makes them). Only a writer that
// holds the file's lock makes one, so while the lock is held every such file is a leftover.
void removeLeftovers(const std::string& folder, const std::string& name) {
    const std::string prefix = "." + name + ".";
    std::vector<std::string> names;
    if (listFolder(folder, names) != 0) return;  // they stay until a later write
    for (const std::string& entry : names)
        if (entry.size() == prefix.size() + 6 && entry.compare(0, prefix.size(), prefix) == 0)
            ::unlink((folder + "/" + entry).c_str());
}

}  // namespace

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

namespace {

// How long a request waits for its answer; a driver that does not answer in this time has its
// connection closed, so that a late answer can never be taken for the next request's.
constexpr int kAnswerSeconds = 30;
constexpr std::size_t kHeaderSize = 8;

void putU32(std::uint8_t* at, std::uint32_t value) {
    for (int i = 0; i < 4; ++i) at[i] = static_cast<std::uint8_t>(value >> (8 * i));
}

std::uint32_t getU32(const std::uint8_t* at) {
    std::uint32_t value = 0;
    for (int i = 3; i >= 0; --i) value = (value << 8) | at[i];
    return value;
}

int connectTo(const std::string& path, int& error) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    if (path.empty() || path.size() >= sizeof address.sun_path) {
        error = path.empty() ? ENOENT : ENAMETOOLONG;
        return -1;
    }
    std::memcpy(address.sun_path, path.c_str(), path.size() + 1);
    const int socket = ::socket(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0);
    if (socket < 0) {
        error = errno;
        return -1;
    }
    // A driver that accepts nothing (stopped, its backlog full) would hold connect without end;
    // the send time limit bounds it, and then sending, as the answer limit bounds receiving.
    const timeval limit{kAnswerSeconds, 0};
    ::setsockopt(socket, SOL_SOCKET, SO_SNDTIMEO, &limit, sizeof limit);
    if (::connect(socket, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) {
        error = errno == EAGAIN ? ETIMEDOUT : errno;
        ::close(socket);
        return -1;
    }
    error = 0;
    return socket;
}

// Sends one request message; 0 or the error number. A peer that is gone is an error, not SIGPIPE.
int sendRequest(int socket, std::uint32_t code, const void* in, std::uint32_t inSize, std::uint32_t outSize) {
    std::vector<std::uint8_t> message(kHeaderSize + inSize);
    putU32(message.data(), code);
    putU32(message.data() + 4, outSize);
    if (inSize > 0) std::memcpy(message.data() + kHeaderSize, in, inSize);
    ssize_t sent;
    do sent = ::send(socket, message.data(), message.size(), MSG_NOSIGNAL);
    while (sent < 0 && errno == EINTR);
    if (sent < 0) return errno == EAGAIN || errno == EWOULDBLOCK ? ETIMEDOUT : errno;
    return static_cast<std::size_t>(sent) == message.size() ? 0 : EPROTO;
}

// Receives one answer message into `out`; 0 or the error number (the driver's or the transport's).
int receiveAnswer(int socket, void* out, std::uint32_t outSize, std::uint32_t& returned) {
    returned = 0;
    std::vector<std::uint8_t> message(kHeaderSize + outSize);
    ssize_t received;
    do received = ::recv(socket, message.data(), message.size(), MSG_TRUNC);
    while (received < 0 && errno == EINTR);
    if (received < 0) return errno == EAGAIN || errno == EWOULDBLOCK ? ETIMEDOUT : errno;
    if (received == 0) return ECONNRESET;  // the driver closed the connection
    return decodeDriverAnswer(message.data(), static_cast<std::size_t>(received), out, outSize, returned);
}

}  // namespace

int decodeDriverAnswer(const std::uint8_t* message, std::size_t received, void* out, std::uint32_t outSize,
                       std::uint32_t& returned) noexcept {
    returned = 0;
    if (received < kHeaderSize || received > kHeaderSize + outSize) return EPROTO;
    const std::uint32_t size = getU32(message + 4);
    if (size != received - kHeaderSize) return EPROTO;
    const std::int32_t error = static_cast<std::int32_t>(getU32(message));
    if (error < 0 || error > 4095) return EPROTO;
    // An answer is final: a driver that calls it pending has answered nothing that can be used.
    if (error == EAGAIN || error == EINPROGRESS) return EBADMSG;
    if (size > 0) std::memcpy(out, message + kHeaderSize, size);
    returned = size;
    return error;
}

struct DeviceChannel::State {
    int socket = -1;
    std::string path;
    std::mutex lock;  // one request and its answer at a time: answers come in order
};

DeviceChannel::DeviceChannel() : _state(std::make_unique<State>()) {}

DeviceChannel::~DeviceChannel() { close(); }

int DeviceChannel::open(const std::string& path) noexcept {
    std::lock_guard<std::mutex> hold(_state->lock);
    int error = 0;
    const int socket = connectTo(path, error);
    if (socket < 0) return error;
    const timeval limit{kAnswerSeconds, 0};
    ::setsockopt(socket, SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof limit);
    _state->socket = socket;
    _state->path = path;
    return 0;
}

void DeviceChannel::close() noexcept {
    std::lock_guard<std::mutex> hold(_state->lock);
    if (_state->socket >= 0) ::close(_state->socket);
    _state->socket = -1;
}

bool DeviceChannel::isOpen() const noexcept {
    std::lock_guard<std::mutex> hold(_state->lock);
    return _state->socket >= 0;
}

const std::string& DeviceChannel::path() const noexcept { return _state->path; }

int DeviceChannel::control(std::uint32_t code, const void* in, std::uint32_t inSize, void* out, std::uint32_t outSize,
                           std::uint32_t& returned) noexcept {
    returned = 0;
    std::lock_guard<std::mutex> hold(_state->lock);
    if (_state->socket < 0) return ENOTCONN;
    int error = sendRequest(_state->socket, code, in, inSize, outSize);
    if (error == 0) error = receiveAnswer(_state->socket, out, outSize, returned);
    // Lost step: the connection cannot tell later answers apart, so it ends here.
    if (error == ETIMEDOUT || error == EPROTO || error == ECONNRESET || error == EPIPE) {
        ::close(_state->socket);
        _state->socket = -1;
    }
    return error;
}

DeviceWait::~DeviceWait() {
    if (_socket >= 0) ::close(_socket);
}

int DeviceWait::arm(const std::string& path, std::uint32_t code, const void* in, std::uint32_t inSize,
                    std::uint64_t& identifier) noexcept {
    identifier = 0;
    abandon();
    if (_socket >= 0) ::close(_socket);
    int error = 0;
    _socket = connectTo(path, error);
    if (_socket < 0) return error;
    // The driver arms a wait at once; the end of the wait may take as long as it takes.
    timeval limit{kAnswerSeconds, 0};
    ::setsockopt(_socket, SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof limit);
    std::uint8_t armed[8] = {};
    std::uint32_t returned = 0;
    error = sendRequest(_socket, code, in, inSize, sizeof armed);
    if (error == 0) error = receiveAnswer(_socket, armed, sizeof armed, returned);
    if (error == 0 && returned != sizeof armed) error = EPROTO;
    if (error == 0) identifier = getU32(armed) | (static_cast<std::uint64_t>(getU32(armed + 4)) << 32);
    limit = timeval{0, 0};
    ::setsockopt(_socket, SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof limit);
    return error;
}

int DeviceWait::awaitEnd() noexcept {
    if (_socket < 0) return ENOTCONN;
    std::uint32_t returned = 0;
    return receiveAnswer(_socket, nullptr, 0, returned);
}

void DeviceWait::abandon() noexcept {
    if (_socket >= 0) ::shutdown(_socket, SHUT_RDWR);
}

// Device enumeration over the sysfs layout below $TIKTAL_SYSROOT.
namespace {

// The PCI path of a resolved device folder ".../sys/devices/pciDDDD:BB/F1/F2/...": the functions
// after the root folder, and the root folder's name.
int pciPathOf(const std::string& resolved, const std::string& devices, std::string& root, std::vector<std::string>& path) {
    if (resolved.compare(0, devices.size() + 1, devices + "/") != 0) return ENODEV;
    std::vector<std::string> parts;
    for (std::size_t at = devices.size() + 1, end; at < resolved.size(); at = end + 1) {
        end = std::min(resolved.find('/', at), resolved.size());
        parts.push_back(resolved.substr(at, end - at));
    }
    if (parts.size() < 2 || parts[0].compare(0, 3, "pci") != 0) return ENODEV;
    root = parts[0];
    path.assign(parts.begin() + 1, parts.end());
    return 0;
}

}  // namespace

OsError enumerateDeviceInterfaces(std::vector<DeviceInterfaceEntry>& entries, std::string& failedPath) noexcept {
    try {
        entries.clear();
        const std::string base = sysroot();
        const std::string classFolder = base + "/sys/class/tiktal";
        std::vector<std::string> names, roots;
        if (int error = listFolder(classFolder, names)) {
            if (error == ENOENT) return {};  // no driver: no devices
            failedPath = classFolder;
            return {"opendir", error};
        }
        char resolved[PATH_MAX];
        const std::string devices = ::realpath((base + "/sys/devices").c_str(), resolved) ? resolved : "";
        listFolder(devices, roots);
        roots.erase(std::remove_if(roots.begin(), roots.end(), [](const std::string& n) { return n.compare(0, 3, "pci") != 0; }),
                    roots.end());
        for (const std::string& name : names) {
            DeviceInterfaceEntry entry;
            entry.name = name;
            entry.classFolder = classFolder + "/" + name;
            entry.interfacePath = base + "/dev/" + name;
            failedPath = entry.classFolder + "/device";
            if (!::realpath(failedPath.c_str(), resolved)) {
                // Removed while the folder was listed (not present), or no folder (no device).
                if (errno == ENOENT || errno == ENOTDIR) continue;
                return {"realpath", errno};
            }
            entry.pciFolder = resolved;
            std::string root;
            if (int error = pciPathOf(entry.pciFolder, devices, root, entry.pciPath)) return {"realpath", error};
            entry.rootIndex = static_cast<int>(std::find(roots.begin(), roots.end(), root) - roots.begin());
            entries.push_back(std::move(entry));
        }
        failedPath.clear();
        return {};
    } catch (const std::bad_alloc&) {
        return {"malloc", ENOMEM};
    }
}

// Modules of the graphical environment's run time.
namespace {

link_map* linkMapOf(void* module) {
    link_map* map = nullptr;
    return module && dlinfo(module, RTLD_DI_LINKMAP, &map) == 0 ? map : nullptr;
}

// The main program's handle; the program stays loaded, so the reference is given back at once.
void* mainProgram() noexcept {
    void* program = dlopen(nullptr, RTLD_NOW);
    if (program) dlclose(program);
    return program;
}

// The loaded object that defines the address `symbol`.
link_map* definingObject(const void* symbol) {
    Dl_info info{};
    link_map* map = nullptr;
    return dladdr1(symbol, &info, reinterpret_cast<void**>(&map), RTLD_DL_LINKMAP) ? map : nullptr;
}

}  // namespace

void* threadModule(std::uint32_t index) noexcept {
    if (index == 0xFFFFFFFFu) return nullptr;
    return pthread_getspecific(static_cast<pthread_key_t>(index));
}

void* mainProgramDefining(std::initializer_list<const char*> names) noexcept {
    void* program = mainProgram();
    for (const char* name : names)
        if (moduleSymbol(program, name)) return program;
    return nullptr;
}

void* loadedLibrary(const char* name) noexcept {
    void* library = dlopen(name, RTLD_NOW | RTLD_NOLOAD);
    if (library) dlclose(library);  // the handle stays valid: the object was loaded before
    return library;
}

void* moduleSymbol(void* module, const char* name) noexcept {
    void* symbol = module ? dlsym(module, name) : nullptr;
    // dlsym also searches what the module loaded, and for the main program every global object.
    return symbol && definingObject(symbol) == linkMapOf(module) ? symbol : nullptr;
}

// A module's file has no version stamp of its own here: its stamp is an FNV-1a hash of the
// device, inode and modification time of the file, which every load of the same file shares.
std::uint32_t moduleStamp(void* module) noexcept {
    const link_map* map = linkMapOf(module);
    const char* path = map && map->l_name && *map->l_name ? map->l_name : "/proc/self/exe";
    struct stat file {};
    if (::stat(path, &file) != 0) return 1;
    const std::uint64_t fields[] = {file.st_dev, file.st_ino, static_cast<std::uint64_t>(file.st_mtim.tv_sec),
                                    static_cast<std::uint64_t>(file.st_mtim.tv_nsec)};
    std::uint32_t hash = 2166136261u;
    for (std::uint64_t field : fields)
        for (int byte = 0; byte < 8; ++byte) hash = (hash ^ ((field >> (8 * byte)) & 0xFF)) * 16777619u;
    return hash != 0 ? hash : 1;  // 0 marks a free cache entry
}

bool isModuleLoaded(void* module) noexcept {
    if (module == mainProgram()) return true;
    std::vector<std::string> names;
    try {
        dl_iterate_phdr(
            [](dl_phdr_info* info, std::size_t, void* list) {
                if (info->dlpi_name && *info->dlpi_name) static_cast<std::vector<std::string>*>(list)->push_back(info->dlpi_name);
                return 0;
            },
            &names);
    } catch (const std::bad_alloc&) {
        return true;  // not known to be gone
    }
    for (const std::string& name : names)
        if (loadedLibrary(name.c_str()) == module) return true;
    return false;
}

void fatalError(const std::string& text) noexcept {
    const std::string line = "Fatal Error: " + text + "\n";
    writeDebugOutput(line.data(), line.size());
    ::_exit(1);
}

bool exists(const std::string& path) noexcept {
    struct stat status {};
    return ::lstat(path.c_str(), &status) == 0;
}

OsError readLink(const std::string& path, std::string& target) {
    char buffer[PATH_MAX];
    const ssize_t length = ::readlink(path.c_str(), buffer, sizeof buffer);
    if (length < 0) return {"readlink", errno};
    if (static_cast<std::size_t>(length) == sizeof buffer) return {"readlink", ENAMETOOLONG};
    target.assign(buffer, static_cast<std::size_t>(length));
    return {};
}

int readAttributeFile(const std::string& path, std::string& text) noexcept {
    if (const OsError error = readRegularFile(path, 4096, text)) return error.code == EFBIG ? EOVERFLOW : error.code;
    while (!text.empty() && (text.back() == '\n' || text.back() == '\r')) text.pop_back();
    return 0;
}

}  // namespace platform

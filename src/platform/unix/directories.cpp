// Folders and small files: the data directory, folder listings, whole regular files, links.
#include "platform/platform.h"
#include "platform/unix/unix.h"

#include <dirent.h>
#include <fcntl.h>
#include <limits.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <new>

namespace platform {

std::string sysroot() {
    const char* root = std::getenv("TIKTAL_SYSROOT");
    return root ? root : "";
}

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

namespace {

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


bool removeFile(const std::string& path) noexcept { return ::unlink(path.c_str()) == 0; }

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


}  // namespace platform

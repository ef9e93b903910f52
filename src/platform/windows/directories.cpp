// Folders and small files: the data directory, folder listings, whole regular files.
#include "platform/platform.h"
#include "platform/windows/windows.h"

#include <shlobj.h>

#include <algorithm>
#include <cstring>
#include <new>

namespace platform {
namespace {

bool isSeparator(char c) { return c == '/' || c == '\\'; }

// A file that is neither a folder nor a link (a reparse point), nor a device.
bool isRegular(DWORD attributes) {
    return !(attributes & (FILE_ATTRIBUTE_DIRECTORY | FILE_ATTRIBUTE_REPARSE_POINT | FILE_ATTRIBUTE_DEVICE));
}

int readFolder(HANDLE search, WIN32_FIND_DATAA& found, std::vector<DirectoryEntry>& entries) {
    do {
        if (std::strcmp(found.cFileName, ".") != 0 && std::strcmp(found.cFileName, "..") != 0)
            entries.push_back({found.cFileName, isRegular(found.dwFileAttributes)});
    } while (FindNextFileA(search, &found));
    const DWORD error = GetLastError();
    return error == ERROR_NO_MORE_FILES ? 0 : static_cast<int>(error);
}

}  // namespace

// The folder Korvane\tiktal of the common application-data folder (C:\ProgramData).
std::string dataDirectory() {
    char folder[MAX_PATH];
    if (SHGetFolderPathA(nullptr, CSIDL_COMMON_APPDATA, nullptr, SHGFP_TYPE_CURRENT, folder) != S_OK) return "";
    return std::string(folder) + "\\Korvane\\tiktal";
}

OsError makeDirectories(const std::string& path) {
    // Each folder on the way, after the drive ("C:\") or the share; the last is `path` itself.
    for (std::size_t end = 0; end != std::string::npos;) {
        end = path.find_first_of("/\\", end + 1);
        const std::string folder = path.substr(0, end);
        if (folder.empty() || isSeparator(folder.back()) || folder.back() == ':' || folder.size() <= 2) continue;
        if (!CreateDirectoryA(folder.c_str(), nullptr) && GetLastError() != ERROR_ALREADY_EXISTS)
            return {"CreateDirectoryA", static_cast<int>(GetLastError())};
    }
    const DWORD attributes = GetFileAttributesA(path.c_str());
    if (attributes == INVALID_FILE_ATTRIBUTES) return {"GetFileAttributesA", static_cast<int>(GetLastError())};
    if (!(attributes & FILE_ATTRIBUTE_DIRECTORY)) return {"CreateDirectoryA", error::kNotAFolder};
    return {};
}

int readWhole(HANDLE file, std::size_t limit, std::string& text) {
    text.clear();
    char block[65536];
    for (std::uint64_t offset = 0;;) {
        OVERLAPPED at{};
        at.Offset = static_cast<DWORD>(offset);
        at.OffsetHigh = static_cast<DWORD>(offset >> 32);
        DWORD got = 0;
        if (!ReadFile(file, block, sizeof block, &got, &at)) {
            const DWORD error = GetLastError();
            if (error == ERROR_HANDLE_EOF) return 0;
            return static_cast<int>(error);
        }
        if (got == 0) return 0;
        // Counted before it is kept, so that a file far beyond the limit costs no more memory.
        if (got > limit - text.size()) {
            text.clear();
            return error::kFileTooLarge;
        }
        text.append(block, got);
        offset += got;
    }
}

int listDirectory(const std::string& path, std::vector<DirectoryEntry>& entries) noexcept {
    entries.clear();
    WIN32_FIND_DATAA found{};
    const HANDLE search = FindFirstFileA((path + "\\*").c_str(), &found);
    if (search == INVALID_HANDLE_VALUE) {
        const DWORD error = GetLastError();
        return error == ERROR_PATH_NOT_FOUND ? error::kNotFound : static_cast<int>(error);
    }
    int error = 0;
    try {
        error = readFolder(search, found, entries);
        std::sort(entries.begin(), entries.end(),
                  [](const DirectoryEntry& a, const DirectoryEntry& b) { return a.name < b.name; });
    } catch (const std::bad_alloc&) {
        error = error::kNoMemory;
    }
    FindClose(search);
    if (error) entries.clear();
    return error;
}


OsError readRegularFile(const std::string& path, std::size_t limit, std::string& text) noexcept {
    text.clear();
    // A link is opened as itself (and then refused), never followed.
    const HANDLE file = CreateFileA(path.c_str(), GENERIC_READ, FILE_SHARE_READ | FILE_SHARE_WRITE | FILE_SHARE_DELETE,
                                    nullptr, OPEN_EXISTING, FILE_FLAG_OPEN_REPARSE_POINT | FILE_FLAG_BACKUP_SEMANTICS,
                                    nullptr);
    if (file == INVALID_HANDLE_VALUE) {
        const DWORD error = GetLastError();
        return {"CreateFileA", error == ERROR_PATH_NOT_FOUND ? error::kNotFound : static_cast<int>(error)};
    }
    OsError error;
    BY_HANDLE_FILE_INFORMATION information{};
    if (!GetFileInformationByHandle(file, &information)) {
        error = {"GetFileInformationByHandle", static_cast<int>(GetLastError())};
    } else if (!isRegular(information.dwFileAttributes) || GetFileType(file) != FILE_TYPE_DISK) {
        error = {"CreateFileA", error::kNotFound};
    } else {
        try {
            if (const int failed = readWhole(file, limit, text)) error = {"ReadFile", failed};
        } catch (const std::bad_alloc&) {
            error = {"ReadFile", error::kNoMemory};
        }
    }
    CloseHandle(file);
    return error;
}

bool removeFile(const std::string& path) noexcept { return DeleteFileA(path.c_str()) != 0; }

bool exists(const std::string& path) noexcept { return GetFileAttributesA(path.c_str()) != INVALID_FILE_ATTRIBUTES; }

// Links are not followed anywhere on Windows: no path is reported as a link.
OsError readLink(const std::string&, std::string&) { return {"readlink", error::kInvalid}; }


}  // namespace platform

// What the backends share: pieces written over the platform layer's own functions.
#include "platform/common.h"

#include <chrono>
#include <functional>
#include <random>
#include <thread>

#include "platform/platform.h"

namespace platform {

int listFolder(const std::string& path, std::vector<std::string>& names) {
    std::vector<DirectoryEntry> entries;
    const int error = listDirectory(path, entries);
    names.clear();
    for (DirectoryEntry& entry : entries) names.push_back(std::move(entry.name));
    return error;
}

void removeLeftovers(const std::string& folder, const std::string& name) {
    const std::string prefix = "." + name + ".";
    std::vector<std::string> names;
    if (listFolder(folder, names) != 0) return;  // they stay until a later write
    for (const std::string& entry : names)
        if (entry.size() == prefix.size() + 6 && entry.compare(0, prefix.size(), prefix) == 0)
            removeFile(folder + "/" + entry);
}

std::chrono::microseconds nextLockPause() noexcept {
    // Seeded by thread and time, so that threads of different processes draw differently.
    thread_local std::minstd_rand draw(static_cast<std::minstd_rand::result_type>(
        std::hash<std::thread::id>{}(std::this_thread::get_id()) ^
        static_cast<std::size_t>(std::chrono::steady_clock::now().time_since_epoch().count())));
    return std::chrono::microseconds(500 + draw() % 1000);
}

int readAttributeFile(const std::string& path, std::string& text) noexcept {
    if (const OsError error = readRegularFile(path, 4096, text))
        return error.code == error::kFileTooLarge ? error::kBufferTooSmall : error.code;
    while (!text.empty() && (text.back() == '\n' || text.back() == '\r')) text.pop_back();
    return 0;
}

}  // namespace platform

// The last inventory parsed, kept with the file's stamp and text: a library that looks up devices
// one session at a time must not parse the whole inventory again for every one of them.
#include "inventory.h"

#include <sys/stat.h>

#include <algorithm>
#include <cstdint>
#include <ctime>
#include <mutex>
#include <tuple>

namespace qpxisim {
namespace {

// What stat tells of a file, to the second; any write changes it, except a write of the same size
// within the same second. (Windows has no inode numbers: 0 for every file.)
struct FileStamp {
    dev_t device = 0;
    ino_t inode = 0;
    off_t size = 0;
    std::int64_t modified = 0, changed = 0;  // seconds since the epoch

    auto fields() const { return std::tie(device, inode, size, modified, changed); }
    bool operator==(const FileStamp& other) const { return fields() == other.fields(); }
};

// Past this, a write gets another change time on any file system.
constexpr std::int64_t kStampSettlesInSeconds = 2;

struct Cache {
    std::mutex lock;
    std::string path;
    FileStamp stamp;
    bool settled = false;  // stamped long enough ago that the stamp tells every later write
    std::string text;
    std::shared_ptr<const Inventory> inventory;
};

Cache& cache() {
    static auto* instance = new Cache();  // never destroyed: calls may come during exit
    return *instance;
}

bool stampOf(const std::string& path, FileStamp& stamp) {
    struct stat status {};
    if (::stat(path.c_str(), &status) != 0 || !S_ISREG(status.st_mode)) return false;
    stamp = {status.st_dev, status.st_ino, status.st_size, status.st_mtime, status.st_ctime};
    return true;
}

// Keeps the inventory of the text read from `path`, parsed unless it is the text kept already. A
// failure leaves the cache as it was.
void keep(Cache& kept, const std::string& path, std::string text) {
    if (kept.inventory && kept.path == path && kept.text == text) return;
    std::shared_ptr<const Inventory> parsed = parseInventoryOf(text, path);
    kept.path = path;
    kept.text = std::move(text);
    kept.inventory = std::move(parsed);
}

}  // namespace

std::shared_ptr<const Inventory> readInventory(const std::string& path) {
    const std::time_t now = std::time(nullptr);
    FileStamp stamp;
    std::string text;
    if (!stampOf(path, stamp))  // no file, a folder and the like: nothing to keep
        return readInventoryText(path, text) ? parseInventoryOf(text, path) : std::make_shared<const Inventory>();
    Cache& kept = cache();
    std::lock_guard<std::mutex> hold(kept.lock);
    if (kept.settled && kept.path == path && kept.stamp == stamp) return kept.inventory;
    if (!readInventoryText(path, text)) return std::make_shared<const Inventory>();  // removed meanwhile
    keep(kept, path, std::move(text));
    kept.stamp = stamp;
    // The later of the two times: on Windows the change time is the creation time.
    kept.settled = std::max(stamp.modified, stamp.changed) + kStampSettlesInSeconds < now;
    return kept.inventory;
}

}  // namespace qpxisim

#include "controls.h"

#include "frame.h"
#include "zrrocoapi_sim.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

namespace rocosim {
namespace {

std::vector<std::string>& callLog() {
    static auto* entries = new std::vector<std::string>();  // never destroyed: calls may come during exit
    return *entries;
}

// Writes the whole line or gives up on the first error; the log file is a test aid.
void writeLine(const char* path, std::string line) {
    const int fd = open(path, O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0644);
    if (fd < 0) return;
    for (std::size_t done = 0; done < line.size();) {
        const ssize_t written = write(fd, line.data() + done, line.size() - done);
        if (written < 0 && errno == EINTR) continue;
        if (written <= 0) break;
        done += static_cast<std::size_t>(written);
    }
    close(fd);
}

// The text of `work`, handed out to the caller; null when memory runs out.
template <class Work>
char* handOutOrNull(Work&& work) noexcept {
    try {
        std::lock_guard<std::mutex> lock(serviceLock());
        return handOut(work());
    } catch (const std::exception&) {
        return nullptr;
    }
}

}  // namespace

void appendToLog(const char* entry) noexcept {
    try {
        callLog().emplace_back(entry);
        if (const char* path = std::getenv("ZRROCOAPI_SIM_LOG"); path && *path)
            writeLine(path, std::string(entry) + "\n");
    } catch (const std::bad_alloc&) {  // the log then lacks the call
    }
}

}  // namespace rocosim

using namespace rocosim;

char* zrrocoapi_sim_log(void) {
    return handOutOrNull([] {
        std::string text = "[";
        for (const std::string& entry : callLog()) text += (text.size() > 1 ? "," : "") + entry;
        return text + "]";
    });
}

char* zrrocoapi_sim_routes(const char* device) {
    return handOutOrNull([device] { return service().routesOn(device); });
}

void zrrocoapi_sim_reset(void) {
    std::lock_guard<std::mutex> lock(serviceLock());
    service().clear();
    callLog().clear();
}

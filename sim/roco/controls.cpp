#include "controls.h"

#include "frame.h"
#include "zrrocoapi_sim.h"

#include <cstdio>
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

// Appends the line with one write, so that the lines of several processes never mix: an unbuffered
// stream opened for appending hands the whole line to the system at once. The log file is a test
// aid: a failure leaves it without the line.
void writeLine(const char* path, const std::string& line) {
    std::FILE* file = std::fopen(path, "ab");
    if (!file) return;
    std::setvbuf(file, nullptr, _IONBF, 0);
    std::fwrite(line.data(), 1, line.size(), file);
    std::fclose(file);
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

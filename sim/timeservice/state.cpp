#include "state.h"

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <new>
#include <stdexcept>
#include <unistd.h>

namespace timeservice {
namespace {

// One time reference of each type, with every key that the driver reads for that type plus "type"
// and "isEnabled". Port states, accuracies and priorities differ between them so that a reader can
// tell them apart. The 802.1AS accuracies come once as a name and once as a number, as the service
// may send either; 192.0.2.0/24 is an address block reserved for documentation.
const char* const kDefaultState = R"({
  "device": "sync_1",
  "deviceListPrefix": "/tiktal/",
  "apiVersion": "1",
  "selectedTrId": "PTP1",
  "selectedTrOffsetNanos": "1500000000",
  "readOnlyKeys": ["type", "portState", "stepsRemoved", "meanPathDelay_ns", "asCapable",
                   "gmClockId", "gmClass", "gmClockClass", "gmAccuracy", "gmClockAccuracy",
                   "gmPriority1", "gmPriority2", "gmIpAddress"],
  "timeReferences": {
    "PTP1": {
      "type": "IEEE 1588-2008", "isEnabled": true,
      "portState": "PTP_SLAVE", "stepsRemoved": 1,
      "localClockId": "00:80:2F:FF:FE:12:34:56", "localClass": 248, "localAccuracy": "WITHIN_1US",
      "priority1": 128, "priority2": 128,
      "gmClockId": "00:80:2F:FF:FE:AB:CD:01", "gmClass": 6, "gmAccuracy": "WITHIN_100NS",
      "gmPriority1": 128, "gmPriority2": 128,
      "logSyncInterval": -3, "meanPathDelay_ns": "1234.5", "gmIpAddress": "192.0.2.10",
      "bmcaMode": "masterslave", "interface": "eth0"
    },
    "BC1": {
      "type": "IEEE 1588-2008 BC", "isEnabled": true,
      "localClockId": "00:80:2F:FF:FE:12:34:57", "clockClass": 248, "clockAccuracy": "WITHIN_250NS",
      "priority1": 128, "priority2": 248,
      "gmClockId": "00:80:2F:FF:FE:AB:CD:01", "gmClockClass": 6, "gmClockAccuracy": "WITHIN_25NS",
      "gmPriority1": 128, "gmPriority2": 128
    },
    "AS1": {
      "type": "IEEE 802.1AS-2011", "isEnabled": true,
      "portState": "PTP_MASTER",
      "localClockId": "00:80:2F:FF:FE:12:34:58", "clockClass": 248, "clockAccuracy": "WITHIN_1US",
      "priority1": 246, "priority2": 248,
      "gmClockId": "00:80:2F:FF:FE:12:34:58", "gmClockClass": 248, "gmClockAccuracy": 33,
      "gmPriority1": 246, "gmPriority2": 248,
      "logSyncInterval": -3, "logAnnounceInterval": 0, "interface": "eth1",
      "neighborPropDelayThreshold": "800", "asCapable": true
    },
    "TAB1": {
      "type": "IEEE 802.1AS-2011 TAB", "isEnabled": false,
      "localClockId": "00:80:2F:FF:FE:12:34:59", "clockClass": 248, "clockAccuracy": 254,
      "priority1": 246, "priority2": 248,
      "gmClockId": "00:80:2F:FF:FE:12:34:58", "gmClockClass": 248, "gmClockAccuracy": "WITHIN_1US",
      "gmPriority1": 246, "gmPriority2": 248
    }
  }
})";

}  // namespace

Json parseJson(const std::string& text) {
    const char* end = nullptr;
    Json json(cJSON_ParseWithLengthOpts(text.data(), text.size(), &end, false));
    if (!json) return json;
    const char* stop = text.data() + text.size();
    while (end < stop && (*end == ' ' || *end == '\t' || *end == '\r' || *end == '\n')) ++end;
    if (end != stop) json.reset();  // something follows the value
    return json;
}

std::string printJson(const cJSON* item, bool formatted) {
    char* printed = formatted ? cJSON_Print(item) : cJSON_PrintUnformatted(item);
    if (!printed) throw std::bad_alloc();
    std::string text(printed);
    cJSON_free(printed);
    return text;
}

Json defaultState() { return parseJson(kDefaultState); }

std::string checkState(const cJSON* state) {
    if (!cJSON_IsObject(state)) return "the state is not a JSON object";
    const cJSON* device = cJSON_GetObjectItemCaseSensitive(state, "device");
    if (!cJSON_IsString(device) || device->valuestring[0] == '\0' || std::strchr(device->valuestring, '/'))
        return "\"device\" must be a non-empty text without \"/\"";
    if (!cJSON_IsString(cJSON_GetObjectItemCaseSensitive(state, "deviceListPrefix")))
        return "\"deviceListPrefix\" must be a text";
    const cJSON* readOnly = cJSON_GetObjectItemCaseSensitive(state, "readOnlyKeys");
    if (readOnly) {
        if (!cJSON_IsArray(readOnly)) return "\"readOnlyKeys\" must be an array of texts";
        for (const cJSON* key = readOnly->child; key; key = key->next)
            if (!cJSON_IsString(key)) return "\"readOnlyKeys\" must be an array of texts";
    }
    const cJSON* references = cJSON_GetObjectItemCaseSensitive(state, "timeReferences");
    if (!cJSON_IsObject(references)) return "\"timeReferences\" must be an object";
    for (const cJSON* reference = references->child; reference; reference = reference->next)
        if (!cJSON_IsObject(reference)) return std::string("time reference \"") + reference->string + "\" is not an object";
    return {};
}

Json loadState(const std::string& path) {
    FILE* file = std::fopen(path.c_str(), "rb");
    if (!file) {
        if (errno != ENOENT) throw std::runtime_error(path + ": " + std::strerror(errno));
        Json state = defaultState();
        saveState(path, state.get());
        return state;
    }
    std::string text;
    char buffer[4096];
    for (std::size_t got; (got = std::fread(buffer, 1, sizeof buffer, file)) > 0;) text.append(buffer, got);
    const bool failed = std::ferror(file) != 0;
    std::fclose(file);
    if (failed) throw std::runtime_error(path + ": read error");
    Json state = parseJson(text);
    if (!state) throw std::runtime_error(path + ": not a JSON document");
    const std::string fault = checkState(state.get());
    if (!fault.empty()) throw std::runtime_error(path + ": " + fault);
    return state;
}

void saveState(const std::string& path, const cJSON* state) {
    const std::string text = printJson(state) + "\n";
    const std::string temporary = path + ".tmp" + std::to_string(getpid());
    FILE* file = std::fopen(temporary.c_str(), "wb");
    if (!file) throw std::runtime_error(temporary + ": " + std::strerror(errno));
    const bool written = std::fwrite(text.data(), 1, text.size(), file) == text.size() && std::fflush(file) == 0 &&
                         fsync(fileno(file)) == 0;
    const int error = errno;
    if (std::fclose(file) != 0 || !written) {
        std::remove(temporary.c_str());
        throw std::runtime_error(temporary + ": " + std::strerror(written ? errno : error));
    }
    if (std::rename(temporary.c_str(), path.c_str()) != 0) {
        const int renameError = errno;
        std::remove(temporary.c_str());
        throw std::runtime_error(path + ": " + std::strerror(renameError));
    }
}

}  // namespace timeservice

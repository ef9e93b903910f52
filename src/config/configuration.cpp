#include "config/configuration.h"

#include <algorithm>
#include <cstring>
#include <exception>
#include <string>
#include <vector>

#include "config/loader.h"
#include "json/zrjsonlh.h"
#include "platform/platform.h"

namespace zrjsonconfig {
namespace {

// Equal JSON with object members in the same order, names compared with case: what a loaded,
// unchanged file gives, checked in one walk.
bool equalInOrder(const cJSON* a, const cJSON* b) {
    for (; a && b; a = a->next, b = b->next) {
        if ((a->type & 0xFF) != (b->type & 0xFF) || (a->string == nullptr) != (b->string == nullptr)) return false;
        if (a->string && std::strcmp(a->string, b->string) != 0) return false;
        if (cJSON_IsNumber(a) && a->valuedouble != b->valuedouble) return false;
        if (cJSON_IsString(a) && std::strcmp(a->valuestring, b->valuestring) != 0) return false;
        if (!equalInOrder(a->child, b->child)) return false;
    }
    return a == b;  // both ended
}

// Equal JSON, object members in any order, names compared with case. Each object's members are
// looked up among the other's sorted by name, so a file of many devices in another order costs
// n log n, not n squared.
bool sameMembers(const cJSON* a, const cJSON* b) {
    if ((a->type & 0xFF) != (b->type & 0xFF)) return false;
    if (cJSON_IsNumber(a)) return a->valuedouble == b->valuedouble;
    if (cJSON_IsString(a)) return std::strcmp(a->valuestring, b->valuestring) == 0;
    if (cJSON_IsArray(a)) {
        for (a = a->child, b = b->child; a && b; a = a->next, b = b->next)
            if (!sameMembers(a, b)) return false;
        return a == b;  // both ended
    }
    if (!cJSON_IsObject(a)) return true;  // null, true, false
    std::vector<const cJSON*> members;
    for (const cJSON* member = b->child; member; member = member->next) members.push_back(member);
    const auto byName = [](const cJSON* x, const cJSON* y) { return std::strcmp(x->string, y->string) < 0; };
    std::stable_sort(members.begin(), members.end(), byName);
    std::size_t count = 0;
    for (const cJSON* member = a->child; member; member = member->next, ++count) {
        const auto found = std::lower_bound(members.begin(), members.end(), member, byName);
        if (found == members.end() || std::strcmp((*found)->string, member->string) != 0 || !sameMembers(member, *found))
            return false;
    }
    return count == members.size();
}

bool sameJson(const cJSON* a, const cJSON* b) { return equalInOrder(a, b) || sameMembers(a, b); }

void traceFailure(const char* what) {
    const std::string line = std::string("Fatal configuration error! ") + what + "\n";
    platform::writeDebugOutput(line.data(), line.size());
}

}  // namespace

Configuration::Configuration(LockableFile& file, SaveCallback onSave) : _file(file), _onSave(std::move(onSave)) {
    _file.lock();
}

Configuration::~Configuration() {
    try {
        _file.unlock();
    } catch (...) {
        // Closing the file releases the lock in any case.
    }
}

void Configuration::load(DeviceIteratorInterface* devices, AttributeProviderInterface& provider) {
    try {
        loadLocked(devices, provider);
    } catch (const std::exception& failure) {
        traceFailure(failure.what());
        throw;
    }
}

void Configuration::loadLocked(DeviceIteratorInterface* devices, AttributeProviderInterface& provider) {
    LoadedConfiguration loaded = parseConfiguration(_file.read(), _file.path(), &provider);
    if (devices) mergeDiscovered(loaded.data, *devices, provider);
    _data = std::move(loaded.data);
    _snapshot = std::move(loaded.snapshot);
    saveIfChanged();
}

void Configuration::saveIfChanged() {
    JsonTree configured = _data.configuredJson();
    if (_snapshot && sameJson(_snapshot.get(), configured.get())) return;
    _file.write(zrjsonlh::print(configured.get()));
    _snapshot = std::move(configured);
    if (_onSave) _onSave(_data);
}

}  // namespace zrjsonconfig

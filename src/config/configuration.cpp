#include "config/configuration.h"

#include <cstring>
#include <exception>
#include <string>

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

// Equal JSON, object members in any order, names compared with case.
bool sameJson(const cJSON* a, const cJSON* b) {
    return equalInOrder(a, b) || cJSON_Compare(a, b, true);
}

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

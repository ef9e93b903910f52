// Entry points: the device and terminal containers with their iterators, the terminal list of a
// device, and the texts the service hands out. The stand-in's containers are empty: every
// iterator is at its end, and no terminal container is ever handed out.
#include "frame.h"

#include <cstdlib>

using namespace rocosim;

namespace {

// A terminal of the list of a device: its name and what it can be.
std::string describeTerminal(const Terminal& terminal) {
    Json object = newObject();
    addText(object.get(), "name", terminal.name);
    addBool(object.get(), "source", terminal.drives);
    addBool(object.get(), "destination", terminal.driven);
    addBool(object.get(), "triggerLine", terminal.backplane);
    return print(object.get());
}

void destroyTexts(char** texts, uint32_t count) {
    if (!texts) return;
    for (uint32_t i = 0; i < count; ++i) std::free(texts[i]);
    std::free(texts);
}

// The terminals that exist on the device: the trigger lines only when its chassis is identified.
char** terminalList(const std::string& device, uint32_t& count) {
    std::vector<const Terminal*> existing;
    for (const Terminal& terminal : terminals())
        if (!terminal.backplane || chassisIdentified(device)) existing.push_back(&terminal);
    auto** texts = static_cast<char**>(std::calloc(existing.size() + 1, sizeof(char*)));
    if (!texts) throw std::bad_alloc();
    try {
        for (std::size_t i = 0; i < existing.size(); ++i) texts[i] = handOut(describeTerminal(*existing[i]));
    } catch (...) {
        destroyTexts(texts, static_cast<uint32_t>(existing.size()));
        throw;
    }
    count = static_cast<uint32_t>(existing.size());
    return texts;
}

}  // namespace

uint32_t zrrocoapi_getRoutableDevices(zrrocoapi_Status* st) {
    return Call("getRoutableDevices").run(st, [](Service& s) { return s.newDeviceContainer(); });
}

uint32_t zrrocoapi_DeviceContainer_begin(uint32_t container, zrrocoapi_Status* st) {
    return Call("DeviceContainer_begin").arg("container", container).run(st, [=](Service& s) {
        return s.beginDevices(container);
    });
}

void zrrocoapi_DeviceIterator_next(uint32_t iterator, zrrocoapi_Status* st) {
    Call("DeviceIterator_next").arg("iterator", iterator).run(st, [=](Service& s) { s.refuseAtEnd(iterator); });
}

uint32_t zrrocoapi_DeviceIterator_getTerminalContainer(uint32_t iterator, zrrocoapi_Status* st) {
    return Call("DeviceIterator_getTerminalContainer").arg("iterator", iterator).run(st, [=](Service& s) -> uint32_t {
        s.refuseAtEnd(iterator);
    });
}

char* zrrocoapi_DeviceIterator_getDeviceName(uint32_t iterator, zrrocoapi_Status* st) {
    return Call("DeviceIterator_getDeviceName").arg("iterator", iterator).run(st, [=](Service& s) -> char* {
        s.refuseAtEnd(iterator);
    });
}

int32_t zrrocoapi_DeviceIterator_isEnd(uint32_t iterator) {
    return Call("DeviceIterator_isEnd").arg("iterator", iterator).run(nullptr, [](Service&) { return int32_t{1}; });
}

void zrrocoapi_DeviceContainer_destroy(uint32_t container) {
    Call("DeviceContainer_destroy").arg("container", container).run(nullptr, [=](Service& s) {
        s.destroyDeviceContainer(container);
    });
}

uint32_t zrrocoapi_TerminalContainer_begin(uint32_t container, zrrocoapi_Status* st) {
    return Call("TerminalContainer_begin").arg("container", container).run(st, [=](Service&) -> uint32_t {
        failUnknownHandle("container", container);
    });
}

void zrrocoapi_TerminalIterator_next(uint32_t iterator, zrrocoapi_Status* st) {
    Call("TerminalIterator_next").arg("iterator", iterator).run(st, [=](Service&) {
        failUnknownHandle("iterator", iterator);
    });
}

int32_t zrrocoapi_TerminalIterator_isEnd(uint32_t iterator) {
    return Call("TerminalIterator_isEnd").arg("iterator", iterator).run(nullptr, [](Service&) { return int32_t{1}; });
}

void zrrocoapi_TerminalContainer_destroy(uint32_t container) {
    Call("TerminalContainer_destroy").arg("container", container).run(nullptr, [](Service&) {});
}

char* zrrocoapi_TerminalIterator_getStringAttribute(uint32_t iterator, const char* name, zrrocoapi_Status* st) {
    return Call("TerminalIterator_getStringAttribute")
        .arg("iterator", iterator)
        .arg("name", name)
        .run(st, [=](Service&) -> char* { failUnknownHandle("iterator", iterator); });
}

int32_t zrrocoapi_TerminalIterator_getBoolAttribute(uint32_t iterator, const char* name, zrrocoapi_Status* st) {
    return Call("TerminalIterator_getBoolAttribute")
        .arg("iterator", iterator)
        .arg("name", name)
        .run(st, [=](Service&) -> int32_t { failUnknownHandle("iterator", iterator); });
}

char** zrrocoapi_getTerminalNamesAndAttributesForDevice(const char* device, uint32_t* count, zrrocoapi_Status* st) {
    if (count) *count = 0;
    return Call("getTerminalNamesAndAttributesForDevice")
        .arg("device", device)
        .given("count", count)
        .run(st, [=](Service&) {
            if (!count) fail(code::kInvalidArgument, "no count (null)", {{"device", textOf(device)}});
            return terminalList(knownDevice(device), *count);
        });
}

void zrrocoapi_destroyStringArray(char** texts, uint32_t count) {
    Call("destroyStringArray").given("texts", texts).arg("count", count).run(nullptr, [=](Service&) {
        destroyTexts(texts, count);
    });
}

void zrrocoapi_destroyString(char* text) {
    Call("destroyString").given("text", text).run(nullptr, [=](Service&) { std::free(text); });
}

#include "config/failure.h"

#include <new>

namespace zrjsonconfig {
namespace {

constexpr char kTranslator[] = "vllator_tiktal";

cJSON* checked(cJSON* item) {
    if (!item) throw std::bad_alloc();
    return item;
}

void addString(cJSON* object, const char* name, const char* value) {
    checked(cJSON_AddStringToObject(object, name, value));
}

void addNumber(cJSON* object, const char* name, double value) { checked(cJSON_AddNumberToObject(object, name, value)); }

}  // namespace

Failure::Failure(Status status, const char* file, int line)
    : _status(status), _file(file), _line(line), _records(newArray()) {}

Failure& Failure::add(JsonTree record) {
    if (!cJSON_AddItemToArray(_records.get(), record.get())) throw std::bad_alloc();
    record.release();  // the array owns it now
    return *this;
}

Failure& Failure::usage(const char* name, std::uint32_t value) {
    JsonTree record = newObject();
    addString(record.get(), "type", "usage");
    addString(record.get(), "usage", name);
    addNumber(record.get(), "value", value);
    addString(record.get(), "value_type", "uint32_t");
    return add(std::move(record));
}

Failure& Failure::usage(const char* name, const std::string& value) {
    JsonTree record = newObject();
    addString(record.get(), "type", "usage");
    addString(record.get(), "usage", name);
    addString(record.get(), "value", value.c_str());
    addString(record.get(), "value_type", "string");
    return add(std::move(record));
}

Failure& Failure::comment(const std::string& text) {
    JsonTree record = newObject();
    addString(record.get(), "type", "comment");
    addString(record.get(), "comment", text.c_str());
    return add(std::move(record));
}

Failure& Failure::osError(const platform::OsError& error) {
    _osError = error;
    return *this;
}

void Failure::raise() {
    JsonTree info = newObject();
    addString(info.get(), "is_debug", "0");
    addNumber(info.get(), "version", 1);
    addMember(info.get(), "ordered_data", std::move(_records));
    zrerr::Exception failure = zrerr::raise(_status.code, _status.constant, _file, _line);
    failure.addText("translator", kTranslator);
    failure.addJson("translator_info", zrjsonlh::printUnformatted(info.get()).c_str());
    if (_osError) {
        JsonTree internal = newObject();
        addString(internal.get(), "api", _osError.api ? _osError.api : "");
        addNumber(internal.get(), "code", _osError.code);
        addString(internal.get(), "string", platform::osErrorText(_osError.code).c_str());
        addNumber(internal.get(), "status", platform::statusOfOsError(_osError.code));
        failure.addJson("internal_error", zrjsonlh::printUnformatted(internal.get()).c_str());
    }
    throw failure;
}

}  // namespace zrjsonconfig

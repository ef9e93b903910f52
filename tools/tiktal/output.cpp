#include "output.h"

#include <algorithm>
#include <cstdio>
#include <iostream>

namespace cli {

void printTable(const std::vector<Row>& rows) {
    std::vector<std::size_t> widths;
    for (const Row& row : rows) {
        widths.resize(std::max(widths.size(), row.size()));
        for (std::size_t i = 0; i < row.size(); ++i) widths[i] = std::max(widths[i], row[i].size());
    }
    for (const Row& row : rows) {
        std::string line;
        for (std::size_t i = 0; i < row.size(); ++i)
            line += i + 1 < row.size() ? row[i] + std::string(widths[i] - row[i].size() + 2, ' ') : row[i];
        std::cout << line << '\n';
    }
}

void printJson(const cJSON* json) {
    char* text = cJSON_Print(json);
    if (!text) throw std::bad_alloc();
    std::cout << text << '\n';
    cJSON_free(text);
}

cJSON* jsonValue(const Value& value) {
    if (const auto* text = std::get_if<std::string>(&value)) return cJSON_CreateString(text->c_str());
    if (const auto* number = std::get_if<ViInt32>(&value)) return cJSON_CreateNumber(*number);
    if (const auto* flag = std::get_if<bool>(&value)) return cJSON_CreateBool(*flag);
    return cJSON_CreateNumber(std::get<ViReal64>(value));
}

cJSON* jsonText(const std::string* text) { return text ? cJSON_CreateString(text->c_str()) : cJSON_CreateNull(); }

std::string statusHex(ViStatus status) {
    char text[16];
    std::snprintf(text, sizeof text, "0x%08X", static_cast<unsigned>(status));
    return text;
}

std::string statusMessage(ViStatus status, ViStatus* result) {
    ViChar message[TIKTAL_ERROR_MESSAGE_SIZE] = "";
    const ViStatus own = tiktal_error_message(VI_NULL, status, message);
    if (result) *result = own;
    return message;
}

Json statusJson(ViStatus status, const std::string* function) {
    Json json(cJSON_CreateObject());
    if (function) cJSON_AddStringToObject(json.get(), "function", function->c_str());
    cJSON_AddNumberToObject(json.get(), "status", status);
    cJSON_AddStringToObject(json.get(), "statusHex", statusHex(status).c_str());
    cJSON_AddStringToObject(json.get(), "message", statusMessage(status).c_str());
    return json;
}

void reportStatusError(const std::string& function, ViStatus status, bool json) {
    std::cout.flush();
    if (!json) {
        std::cerr << "tiktal: " << function << ": " << statusHex(status) << ' ' << statusMessage(status) << std::endl;
        return;
    }
    Json error = statusJson(status, &function);
    char* text = cJSON_PrintUnformatted(error.get());
    if (text) std::cerr << text << std::endl;
    cJSON_free(text);
}

std::string isoUtc(ViUInt32 seconds, ViUInt32 nanoseconds) {
    // Days since 1970-01-01 to a civil date, counted in 400-year eras that start on 1 March.
    const long long days = seconds / 86400, rest = seconds % 86400;
    const long long z = days + 719468, era = z / 146097, dayOfEra = z - era * 146097;
    const long long yearOfEra = (dayOfEra - dayOfEra / 1460 + dayOfEra / 36524 - dayOfEra / 146096) / 365;
    const long long dayOfYear = dayOfEra - (365 * yearOfEra + yearOfEra / 4 - yearOfEra / 100);
    const long long monthIndex = (5 * dayOfYear + 2) / 153;  // 0 is March
    const long long day = dayOfYear - (153 * monthIndex + 2) / 5 + 1;
    const long long month = monthIndex < 10 ? monthIndex + 3 : monthIndex - 9;
    const long long year = yearOfEra + era * 400 + (month <= 2 ? 1 : 0);
    char text[48];
    std::snprintf(text, sizeof text, "%04lld-%02lld-%02lldT%02lld:%02lld:%02lld.%09uZ", year, month, day, rest / 3600,
                  rest / 60 % 60, rest % 60, static_cast<unsigned>(nanoseconds));
    return text;
}

}  // namespace cli

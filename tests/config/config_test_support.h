// What the configuration tests share: a temporary simulated machine, plain file access beside the
// library's, and the details of a configuration failure in a form tests can compare.
#pragma once

#include <cjson/cJSON.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <sstream>
#include <string>
#include <vector>

#include "child_process.h"
#include "errors/zrerr.h"

namespace configtest {

// TIKTAL_SYSROOT points at a new empty folder while this lives.
class Sysroot {
public:
    Sysroot() : _root(tiktaltest::makeTemporaryFolder("tiktal-config")) { setenv("TIKTAL_SYSROOT", _root.c_str(), 1); }
    ~Sysroot() {
        unsetenv("TIKTAL_SYSROOT");
        tiktaltest::removeFolder(_root);
    }
    Sysroot(const Sysroot&) = delete;
    Sysroot& operator=(const Sysroot&) = delete;
    const std::string& root() const { return _root; }
    std::string dataDirectory() const { return _root + "/var/lib/Korvane/tiktal"; }
    std::string configPath() const { return dataDirectory() + "/tiktal.config"; }

private:
    std::string _root;
};

// Writes `text` as the whole file, creating the folders on the way.
inline void writeText(const std::string& path, const std::string& text) {
    std::filesystem::create_directories(std::filesystem::path(path).parent_path());
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    out << text;
    ASSERT_TRUE(out.good()) << path;
}

inline std::string readText(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

// The names in a folder, sorted.
inline std::vector<std::string> namesIn(const std::string& folder) {
    std::vector<std::string> names;
    for (const auto& entry : std::filesystem::directory_iterator(folder)) names.push_back(entry.path().filename());
    std::sort(names.begin(), names.end());
    return names;
}

// A configuration failure as tests compare it. Records read "usage=value" for a usage and
// "# text" for a comment, in their order.
struct Details {
    bool raised = false;
    std::int32_t code = 0;
    std::string constant;
    std::string translator;
    std::vector<std::string> records;
    std::string api;  // of "internal_error", "" without one
    int osCode = 0;
    std::int32_t osStatus = 0;
};

inline Details detailsOf(const zrerr::ExceptionBase& failure) {
    Details details;
    details.raised = true;
    details.code = failure.code();
    cJSON* root = cJSON_Parse(failure.what());
    EXPECT_NE(root, nullptr) << "details are not JSON: " << failure.what();
    if (!root) return details;
    auto text = [](const cJSON* item) { return cJSON_IsString(item) ? std::string(item->valuestring) : std::string(); };
    details.constant = text(cJSON_GetObjectItem(root, "error_constant"));
    details.translator = text(cJSON_GetObjectItem(root, "translator"));
    const cJSON* info = cJSON_GetObjectItem(root, "translator_info");
    const cJSON* ordered = info ? cJSON_GetObjectItem(info, "ordered_data") : nullptr;
    for (const cJSON* record = ordered ? ordered->child : nullptr; record; record = record->next) {
        if (text(cJSON_GetObjectItem(record, "type")) == "comment") {
            details.records.push_back("# " + text(cJSON_GetObjectItem(record, "comment")));
            continue;
        }
        const cJSON* value = cJSON_GetObjectItem(record, "value");
        const std::string valueType = text(cJSON_GetObjectItem(record, "value_type"));
        EXPECT_EQ(valueType, cJSON_IsNumber(value) ? "uint32_t" : "string");
        details.records.push_back(text(cJSON_GetObjectItem(record, "usage")) + "=" +
                                  (cJSON_IsNumber(value) ? std::to_string(static_cast<std::uint64_t>(value->valuedouble)) : text(value)));
    }
    if (const cJSON* internal = cJSON_GetObjectItem(root, "internal_error")) {
        details.api = text(cJSON_GetObjectItem(internal, "api"));
        details.osCode = cJSON_GetObjectItem(internal, "code")->valueint;
        details.osStatus = cJSON_GetObjectItem(internal, "status")->valueint;
        EXPECT_FALSE(text(cJSON_GetObjectItem(internal, "string")).empty());
    }
    cJSON_Delete(root);
    return details;
}

// The details of the status exception that `call` raises; `raised` is false when it raised none.
template <class Call>
Details failureOf(Call call) {
    try {
        call();
    } catch (const zrerr::ExceptionBase& failure) {
        return detailsOf(failure);
    }
    return {};
}

}  // namespace configtest

// The failures of the configuration subsystem: the status exception with the translator block
// that configuration errors carry in their details, after the standard members:
//   "translator": "vllator_tiktal",
//   "translator_info": {"is_debug": "0", "version": 1, "ordered_data": [records]},
//   "internal_error": {"api", "code", "string", "status"}  (only for a failed system call)
// A record is a usage {"type": "usage", "usage": name, "value": value, "value_type": "uint32_t"
// or "string"} or a comment {"type": "comment", "comment": text}.
#pragma once

#include <cstdint>
#include <string>

#include "config/json_tree.h"
#include "errors/zrerr.h"
#include "json/zrjsonlh.h"
#include "platform/platform.h"

namespace zrjsonconfig {

// A status with the error-constant name its details carry.
struct Status {
    std::int32_t code;
    const char* constant;
};

inline constexpr Status kResourceNotFound{-52006, "nZRAPALS100::tStatus::kResourceNotFound"};
inline constexpr Status kTimeout{-52007, "zrapalerr_timeout"};
inline constexpr Status kOsFault{-52008, "zrapalerr_osFault"};
inline constexpr Status kEndOfData{-52012, "nZRAPALS100::tStatus::kEndOfData"};
inline constexpr Status kObjectNameCollision{-52013, "zrapalerr_objectNameCollision"};
inline constexpr Status kErrorFileTooNewForSoftware{static_cast<std::int32_t>(0xBFFA917D),
                                                    "zrvll::kErrorFileTooNewForSoftware"};
inline constexpr Status kErrorSoftwareTooNewForFile{static_cast<std::int32_t>(0xBFFA917E),
                                                    "zrvll::kErrorSoftwareTooNewForFile"};
inline constexpr Status kErrorDeviceEntryNotFound{static_cast<std::int32_t>(0xBFFA917F),
                                                  "zrvll::kErrorDeviceEntryNotFound"};
// The JSON layer's statuses, raised here when the file's text fails them, so that the details
// can name the file.
inline constexpr Status kInvalidJson{zrjsonlh::jsonErrorsInvalidJSON, "jsonErrorsInvalidJSON"};
inline constexpr Status kNotAnObject{zrjsonlh::jsonErrorsNotAnObject, "jsonErrorsNotAnObject"};
inline constexpr Status kTypeMismatch{zrjsonlh::jsonErrorsTypeMismatch, "jsonErrorsTypeMismatch"};
inline constexpr Status kObjectItemNotFound{zrjsonlh::jsonErrorsObjectItemNotFound, "jsonErrorsObjectItemNotFound"};

// Usage names of the records.
inline constexpr char kUsageTypeFilePath[] = "kUsageTypeFilePath";
inline constexpr char kUsageTypeToken[] = "kUsageTypeToken";
inline constexpr char kUsageTypeFileVersion[] = "kUsageTypeFileVersion";
inline constexpr char kUsageTypeSupportedVersion[] = "kUsageTypeSupportedVersion";
inline constexpr char kUsageTypeOldestCompatibleVersion[] = "kUsageTypeOldestCompatibleVersion";

// One failure under construction: records in the order added, then raise().
//   ZRJSONCONFIG_FAILURE(kEndOfData).usage(kUsageTypeFilePath, path).comment("Failed to read file").raise();
class Failure {
public:
    Failure(Status status, const char* file, int line);
    Failure& usage(const char* name, std::uint32_t value);
    Failure& usage(const char* name, const std::string& value);
    Failure& comment(const std::string& text);
    // The system call that failed, written as "internal_error" (one per failure).
    Failure& osError(const platform::OsError& error);
    [[noreturn]] void raise();

private:
    Failure& add(JsonTree record);
    Status _status;
    const char* _file;
    int _line;
    JsonTree _records;
    platform::OsError _osError;
};

}  // namespace zrjsonconfig

#define ZRJSONCONFIG_FAILURE(status) ::zrjsonconfig::Failure((status), ZRERR_FILE, __LINE__)

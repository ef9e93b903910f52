// Checked reading of the driver's JSON files (the configuration file, the simulated-device files):
// every failure is a configuration failure that names the file.
#pragma once

#include <cstdint>
#include <string>

#include "config/json_tree.h"

namespace zrjsonconfig {

// The text of the file at `path` as one JSON object: UTF-8, no NUL byte (nor a string with the
// escape \u0000, which would cut the string short), nothing but white space
// after the object, no number beyond the range of a double (it could not be written back), and
// no deeper nesting than cJSON's bound (1000): jsonErrorsInvalidJSON (-52005), or
// jsonErrorsNotAnObject (-52004) for a value that is not an object.
JsonTree parseObjectText(const std::string& text, const std::string& path);

// The member `name` as a whole number from 0 to 4294967295, else jsonErrorsTypeMismatch (-52004).
std::uint32_t wholeNumber(const cJSON* item, const char* name, const std::string& path);

// The member `name` as text, else jsonErrorsTypeMismatch (-52004).
std::string textValue(const cJSON* item, const char* name, const std::string& path);

}  // namespace zrjsonconfig

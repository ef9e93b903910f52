// Refusals of the PXI chassis query stand-in: codes, and the details written into the caller's
// status record (by simcommon::writeStatus).
#pragma once

#include "zrqpxi.h"

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

namespace qpxisim {

// The stand-in's own codes (README.md lists when each is given).
namespace code {
constexpr std::int32_t kUnknownHandle = -88501;
constexpr std::int32_t kNoSuchAttribute = -88502;
constexpr std::int32_t kNoSuchItem = -88503;
constexpr std::int32_t kNotContained = -88504;
constexpr std::int32_t kBadInventory = -88505;
constexpr std::int32_t kInvalidArgument = -88506;
constexpr std::int32_t kOutOfResources = -88507;
}  // namespace code

// A refused call: its code, a message and named values (numbers or texts) for the JSON details.
struct Failure {
    std::int32_t code;
    std::string msg;
    std::vector<std::pair<std::string, std::string>> texts;
    std::vector<std::pair<std::string, double>> numbers;
};

[[noreturn]] void fail(std::int32_t code, std::string msg);
[[noreturn]] void failUnknownHandle(const char* kind, std::uint32_t handle);

// The JSON object of a refusal of the entry point `function`; bytes outside ASCII in texts
// become "?", so the object is always UTF-8.
std::string details(const char* function, const Failure& failure);

}  // namespace qpxisim

// Refusals of the routing-service stand-in, and the writer of the caller's status record.
#pragma once

#include "zrrocoapi.h"

#include <cstdint>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace rocosim {

// The service's own codes (README.md lists when each is given).
namespace code {
constexpr std::int32_t kSourceInvalid = -89120;
constexpr std::int32_t kDestinationInvalid = -89121;
constexpr std::int32_t kDestinationInUse = -89123;
constexpr std::int32_t kNoSuchRoute = -89124;
constexpr std::int32_t kResetInProgress = -89125;
constexpr std::int32_t kNoResetInProgress = -89126;
constexpr std::int32_t kDestinationInverted = -89127;
constexpr std::int32_t kDeviceNotFound = -89130;
constexpr std::int32_t kRoutedBySession = -89132;
constexpr std::int32_t kAcrossDevices = -89139;
constexpr std::int32_t kDeviceResetting = -89140;
constexpr std::int32_t kSourceNeedsChassis = -89141;
constexpr std::int32_t kDestinationNeedsChassis = -89142;
constexpr std::int32_t kSourceCannotDrive = -89150;
constexpr std::int32_t kInvalidArgument = -89168;
}  // namespace code

// Named texts for the JSON details; a text without value is the caller's null pointer.
using Args = std::vector<std::pair<std::string, std::optional<std::string>>>;
std::optional<std::string> textOf(const char* text);

// A refused call: its code, a message and the named texts that go into the JSON details. Thrown
// by the service; the entry points catch it.
struct Failure {
    std::int32_t code;
    std::string msg;
    Args args;
};

[[noreturn]] void fail(std::int32_t code, std::string msg, Args args = {});

// Refuses a handle that the service did not hand out, or that has ended (-89168).
[[noreturn]] void failUnknownHandle(const char* kind, std::uint32_t handle);

// The text, with every byte that is not part of well-formed UTF-8 replaced by U+FFFD, so that the
// JSON texts of the stand-in are always UTF-8 whatever the caller passed.
std::string utf8(const std::string& text);

// The JSON object of a refusal of the entry point `function`.
std::string details(const char* function, const Failure& failure);

// Sets the code of a record (null: nothing) and writes `json` into its text when the caller's
// reallocate gives room; a reallocate that is missing or fails leaves the text as it was.
void report(zrrocoapi_Status* st, std::int32_t code, const std::string& json);

}  // namespace rocosim

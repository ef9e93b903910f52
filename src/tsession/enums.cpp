#include "tsession/enums.h"

#include <iterator>
#include <map>

#include "errors/zrerr.h"

namespace tiktal {
namespace {

const std::map<std::string, std::uint8_t> kClockAccuracy = {
    {"WITHIN_25NS", 0x20},  {"WITHIN_100NS", 0x21}, {"WITHIN_250NS", 0x22}, {"WITHIN_1US", 0x23},
    {"WITHIN_2.5US", 0x24}, {"WITHIN_10US", 0x25},  {"WITHIN_25US", 0x26},  {"WITHIN_100US", 0x27},
    {"WITHIN_250US", 0x28}, {"WITHIN_1MS", 0x29},   {"WITHIN_2.5MS", 0x2A}, {"WITHIN_10MS", 0x2B},
    {"WITHIN_25MS", 0x2C},  {"WITHIN_100MS", 0x2D}, {"WITHIN_250MS", 0x2E}, {"WITHIN_1S", 0x2F},
    {"WITHIN_10S", 0x30},   {"GREATER_THAN_10S", 0x31}, {"ACCURACY_UNKNOWN", 0xFE},
};

// The port-state texts in the order of their IEEE 1588 values 0 to 8.
const char* const kPortStates[] = {"PTP_INITIALIZING", "PTP_FAULTY",  "PTP_DISABLED",
                                   "PTP_LISTENING",    "PTP_PRE_MASTER", "PTP_MASTER",
                                   "PTP_PASSIVE",      "PTP_UNCALIBRATED", "PTP_SLAVE"};
const char* const kBmcaModes[] = {"slaveonly", "masterslave", "masteronly"};

// The position of `text` in `names`, or -1.
template <std::size_t N>
int indexOf(const char* const (&names)[N], const std::string& text) {
    for (std::size_t i = 0; i < N; ++i)
        if (text == names[i]) return static_cast<int>(i);
    return -1;
}

}  // namespace

std::uint8_t getClockAccuracyCodeFromString(const std::string& name) {
    const auto found = kClockAccuracy.find(name);
    return found == kClockAccuracy.end() ? 0xFE : found->second;
}

ViInt32 getPtpPortStateEnumFromString(const std::string& text) {
    const int state = indexOf(kPortStates, text);
    if (state < 0)
        throw ZRERR_RAISE(tiktalerr_internalSoftware).debug("func", "`anonymous-namespace'::getPtpPortStateEnumFromString");
    return state;
}

ViInt32 get8021asPortStateEnumFromString(const std::string& text) {
    const int state = indexOf(kPortStates, text);
    if (state < 0)
        throw ZRERR_RAISE(tiktalerr_internalSoftware).debug("func", "`anonymous-namespace'::get8021asPortStateEnumFromString");
    return text == "PTP_MASTER" ? 6 : text == "PTP_SLAVE" ? 9 : 3;
}

ViInt32 getBmcaModeEnumFromString(const std::string& text) {
    const int mode = indexOf(kBmcaModes, text);
    if (mode < 0)
        throw ZRERR_RAISE(tiktalerr_internalSoftware).debug("func", "`anonymous-namespace'::getBmcaModeEnumFromString");
    return mode;
}

std::string getBmcaModeStringFromEnum(ViInt32 value) {
    if (value < 0 || value >= static_cast<ViInt32>(std::size(kBmcaModes)))
        throw ZRERR_RAISE(tiktalerr_invParameter).debug("func", "`anonymous-namespace'::getBmcaModeStringFromEnum");
    return kBmcaModes[value];
}

}  // namespace tiktal

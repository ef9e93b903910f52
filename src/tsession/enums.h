// Conversions between the time service's texts and the numbers of the Int32 attributes, by the
// enumerations of src/tables/enumerations.tsv.
#pragma once

#include <cstdint>
#include <string>

#include <tiktal/tiktal.h>

namespace tiktal {

// The IEEE 1588 accuracy code of a name; 0xFE (unknown) for a name not in the table.
std::uint8_t getClockAccuracyCodeFromString(const std::string& name);
// The number of an IEEE 1588 accuracy, counted from 1; 0 (unknown) for a name not in the table.
ViInt32 getPtpClockAccuracyFromString(const std::string& name);

// These fail with tiktalerr_internalSoftware for a text not in their table.
ViInt32 getPtpPortStateEnumFromString(const std::string& text);
ViInt32 get8021asPortStateEnumFromString(const std::string& text);
ViInt32 getBmcaModeEnumFromString(const std::string& text);
// Fails with tiktalerr_invParameter for a value other than 0, 1 or 2.
std::string getBmcaModeStringFromEnum(ViInt32 value);

}  // namespace tiktal

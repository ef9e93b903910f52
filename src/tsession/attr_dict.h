// The time-service attribute dictionary: which accessor type an attribute has, whether it needs
// a time-reference name, its JSON key per time-reference type, and its enumeration.
#pragma once

#include <map>
#include <string>

#include <tiktal/tiktal.h>

#include "enumerations.h"

namespace tiktal {

enum class AttrValueType : int { String = 0, Int32 = 1, Real64 = 2, Boolean = 3 };

struct ApiAttrData {
    bool activeItemRequired;
    AttrValueType valueType;
    std::map<std::string, std::string> metaDataKeys;  // type text, or "all", to JSON key
    Enumeration enumeration;                          // what an Int32 attribute's numbers stand for

    // False when no name is needed; true when one is needed and given; fails when it is missing.
    bool verifyActiveItemProvided(ViConstString activeItem) const;
    void verifyAttrValidForTimeRef(const std::string& trType) const;
    [[noreturn]] void verifyAttrValidForFunction() const;
    // The "all" entry wins over the entry of `trType`.
    const std::string& getMetaDataAttrKey(const std::string& trType) const;
};

// The record of `attribute`; fails with tiktalerr_nsupAttr for an identifier not in the table.
const ApiAttrData& getAttrData(ViAttr attribute);

}  // namespace tiktal

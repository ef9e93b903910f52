#include "tsession/attr_dict.h"

#include <unordered_map>

#include "errors/zrerr.h"

namespace tiktal {
namespace {

#include "HorloApiAttrDict.inc"

constexpr char kAll[] = "all";

}  // namespace

const ApiAttrData& getAttrData(ViAttr attribute) {
    const auto found = kHorloApiAttrDict.find(attribute);
    if (found == kHorloApiAttrDict.end()) throw ZRERR_RAISE(tiktalerr_nsupAttr).debug("func", "tiktal::getAttrData");
    return found->second;
}

bool ApiAttrData::verifyActiveItemProvided(ViConstString activeItem) const {
    if (!activeItemRequired) return false;
    if (activeItem && *activeItem) return true;
    throw ZRERR_RAISE(tiktalerr_terminalNotSpecified).debug("func", "tiktal::ApiAttrData::verifyActiveItemProvided");
}

void ApiAttrData::verifyAttrValidForTimeRef(const std::string& trType) const {
    if (metaDataKeys.count(kAll) == 0 && metaDataKeys.count(trType) == 0)
        throw ZRERR_RAISE(tiktalerr_trTypeMismatch).debug("func", "tiktal::ApiAttrData::verifyAttrValidForTimeRef");
}

void ApiAttrData::verifyAttrValidForFunction() const {
    throw ZRERR_RAISE(tiktalerr_invalidType).debug("func", "tiktal::ApiAttrData::verifyAttrValidForFunction");
}

const std::string& ApiAttrData::getMetaDataAttrKey(const std::string& trType) const {
    auto found = metaDataKeys.find(kAll);
    if (found == metaDataKeys.end()) found = metaDataKeys.find(trType);
    if (found == metaDataKeys.end())
        throw ZRERR_RAISE(tiktalerr_trTypeMismatch).debug("func", "tiktal::ApiAttrData::getMetaDataAttrKey");
    return found->second;
}

}  // namespace tiktal

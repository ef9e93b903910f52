// Construction of a time-service session and its attribute operations.
#include "tsession/horlo_session.h"

#include <algorithm>
#include <boost/lexical_cast.hpp>
#include <cmath>
#include <iterator>

#include "client/horlo_uri.h"
#include "client/remote_client.h"
#include "errors/zrerr.h"
#include "json/helpers.h"
#include "json/zrjsonlh.h"
#include "tsession/enums.h"

namespace tiktal {
namespace {

using Lock = std::lock_guard<std::mutex>;

using zrerr::kMissingParameter;
constexpr char kParseFailure[] = "Failed to parse attribute from Horlo metadata.";
const char* const kEnableableTypes[] = {"IEEE 802.1AS-2011", "IEEE 1588-2008", "IEEE 802.1AS-2011 TAB", "IEEE 1588-2008 BC"};

void requireOutput(const void* value) {
    if (!value) throw ZRERR_RAISE(tiktalerr_invParameter).debug("message", kMissingParameter).debug("value", "NULL");
}

[[noreturn]] void missingMember(const zrjsonlh::CppJson& data, const std::string& key, const char* message = nullptr) {
    throw ZRERR_RAISE(tiktalerr_internalSoftware)
        .debug("message", message ? message : kParseFailure)
        .debug("json", zrjsonlh::printUnformatted(data.get()))
        .debug("key", key);
}

// A Real64 attribute is a measurement: "inf" or "nan" from the service is no value.
double finite(double value) {
    if (!std::isfinite(value)) throw boost::bad_lexical_cast();
    return value;
}

std::unique_ptr<zrhorlo::RemoteClientApiWrapper> connect(const std::string& resourceName) {
    const horloUtils::HorloUri uri(resourceName);
    try {
        const std::string host = uri.getHost();
        if (host == "localhost" || host == "127.0.0.1")
            throw ZRERR_RAISE(tiktalerr_deviceNotFound).debug("func", "tiktal::HorloSession::HorloSession");
        return std::make_unique<zrhorlo::RemoteClientApiWrapper>(host, uri.getDeviceName());
    } catch (const zrerr::ExceptionBase& e) {
        if (e.code() != -52005) throw;
        throw ZRERR_RAISE(tiktalerr_libLoadFailure).debug("func", "tiktal::HorloSession::HorloSession").cause(e);
    }
}

}  // namespace

std::unique_ptr<Session> createHorloSession(const char* resourceName) { return std::make_unique<HorloSession>(resourceName); }

HorloSession::HorloSession(const char* resourceName) : resourceName(resourceName), client(connect(this->resourceName)) {}

HorloSession::~HorloSession() = default;

std::string HorloSession::getMetaDataKey(ViConstString terminalName, ViAttr attribute, AttrValueType valueType) {
    const ApiAttrData& record = getAttrData(attribute);
    std::string trType;
    if (record.verifyActiveItemProvided(terminalName)) {
        trType = getTrType(terminalName);
        record.verifyAttrValidForTimeRef(trType);
    }
    if (record.valueType != valueType) record.verifyAttrValidForFunction();
    return record.getMetaDataAttrKey(trType);
}

void HorloSession::getTrAttr(ViConstString terminalName, const std::string& key, zrjsonlh::CppJson& data) {
    if (!terminalName) throw ZRERR_RAISE(tiktalerr_terminalNotSpecified).debug("func", "tiktal::HorloSession::getTrAttr");
    client->getTrAttrData(terminalName, key, data);
}

std::string HorloSession::getTrType(ViConstString trName) {
    return readTrAttrText(trName, "type", "Failed to parse time reference type from Horlo metadata.");
}

std::string HorloSession::getSelectedTrId() {
    std::string name;
    client->getSelectedTrId(&name);
    return name;
}

std::int64_t HorloSession::getSelectedTrOffsetNanos() {
    std::int64_t nanos = 0;
    client->getSelectedTrOffsetNanos(&nanos);
    return nanos;
}

std::string HorloSession::getSelectedTrType() {
    const std::string selected = getSelectedTrId();
    return selected.empty() ? std::string() : getTrType(selected.c_str());
}

std::string HorloSession::readTrAttrText(ViConstString terminalName, const std::string& key, const char* missing) {
    zrjsonlh::CppJson data;
    getTrAttr(terminalName, key, data);
    std::string text;
    if (!zrjson::getStringMember(data.get(), key.c_str(), text, zrjson::OnNull::fail)) missingMember(data, key, missing);
    return text;
}

void HorloSession::writeTrAttr(ViConstString terminalName, const std::string& key, const std::string& valueText) {
    if (!terminalName) throw ZRERR_RAISE(tiktalerr_terminalNotSpecified).debug("func", "tiktal::HorloSession::writeTrAttr");
    client->setTrAttr(terminalName, key, valueText);
}

void HorloSession::getAttributeViString(ViConstString terminalName, ViAttr attribute, std::string& valueString) {
    const Lock hold(_lock);
    const std::string key = getMetaDataKey(terminalName, attribute, AttrValueType::String);
    if (attribute == TIKTAL_ATTR_SELECTED_TIME_REFERENCE_TYPE)
        valueString = getSelectedTrType();
    else if (attribute == TIKTAL_ATTR_SELECTED_TIME_REFERENCE)
        valueString = getSelectedTrId();
    else
        valueString = readTrAttrText(terminalName, key);
}

void HorloSession::getAttributeViInt32(ViConstString terminalName, ViAttr attribute, ViInt32* value) {
    requireOutput(value);
    const Lock hold(_lock);
    const std::string key = getMetaDataKey(terminalName, attribute, AttrValueType::Int32);
    switch (getAttrData(attribute).enumeration) {
    case Enumeration::PtpPortState:
        *value = getPtpPortStateEnumFromString(readTrAttrText(terminalName, key));
        return;
    case Enumeration::GptpPortState:
        *value = get8021asPortStateEnumFromString(readTrAttrText(terminalName, key));
        return;
    case Enumeration::BmcaMode:
        *value = getBmcaModeEnumFromString(readTrAttrText(terminalName, key));
        return;
    case Enumeration::PtpClockAccuracy:
        *value = getPtpClockAccuracyFromString(readTrAttrText(terminalName, key));
        return;
    case Enumeration::GptpClockAccuracy: {
        zrjsonlh::CppJson data;
        getTrAttr(terminalName, key, data);
        std::string text;
        try {
            if (!zrjson::getStringMember(data.get(), key.c_str(), text, zrjson::OnNull::fail)) missingMember(data, key);
            *value = getClockAccuracyCodeFromString(text);
        } catch (const zrerr::ExceptionBase& e) {
            if (e.code() != -52004) throw;
            // The service sent the code as a number.
            zrjson::getInt32NumberMember(data.get(), key.c_str(), *value, zrjson::OnNull::fail);
        }
        return;
    }
    case Enumeration::None:
        break;
    }
    zrjsonlh::CppJson data;
    getTrAttr(terminalName, key, data);
    if (attribute == TIKTAL_ATTR_8021AS_NEIGHBOR_PROP_DELAY_THRESHOLD)
        *value = zrjson::getInt32Member(data.get(), key.c_str());
    else if (!zrjson::getInt32NumberMember(data.get(), key.c_str(), *value, zrjson::OnNull::fail))
        missingMember(data, key);
}

void HorloSession::getAttributeViReal64(ViConstString terminalName, ViAttr attribute, ViReal64* value) {
    requireOutput(value);
    const Lock hold(_lock);
    const std::string key = getMetaDataKey(terminalName, attribute, AttrValueType::Real64);
    if (attribute == TIKTAL_ATTR_SELECTED_TIME_REFERENCE_OFFSET) {
        *value = static_cast<double>(getSelectedTrOffsetNanos()) / 1000000000.0;
    } else if (attribute == TIKTAL_ATTR_SELECTED_TIME_REFERENCE_OFFSET_NS) {
        *value = static_cast<double>(getSelectedTrOffsetNanos());
    } else {
        *value = finite(boost::lexical_cast<double>(readTrAttrText(terminalName, key)));  // the service sends a text
    }
}

void HorloSession::getAttributeViBoolean(ViConstString terminalName, ViAttr attribute, ViBoolean* value) {
    requireOutput(value);
    const Lock hold(_lock);
    const std::string key = getMetaDataKey(terminalName, attribute, AttrValueType::Boolean);
    if (attribute == TIKTAL_ATTR_TIME_REFERENCE_SELECTED) {
        // One of the listed names, whole: a part of a name, or several joined, names nothing.
        const std::vector<std::string> names = timeReferenceNames();
        if (std::find(names.begin(), names.end(), terminalName) == names.end())
            throw ZRERR_RAISE(tiktalerr_trInstanceNotFound).debug("func", "tiktal::HorloSession::getAttributeViBoolean");
        *value = getSelectedTrId() == terminalName ? VI_TRUE : VI_FALSE;
        return;
    }
    zrjsonlh::CppJson data;
    getTrAttr(terminalName, key, data);
    bool flag = false;  // a null member reads false
    if (!zrjson::getBoolMember(data.get(), key.c_str(), flag)) missingMember(data, key);
    *value = flag ? VI_TRUE : VI_FALSE;
}

void HorloSession::setAttributeViString(ViConstString terminalName, ViAttr attribute, ViConstString value) {
    if (!value) throw ZRERR_RAISE(tiktalerr_invParameter).debug("message", kMissingParameter).debug("value", "NULL");
    const Lock hold(_lock);
    writeTrAttr(terminalName, getMetaDataKey(terminalName, attribute, AttrValueType::String), value);
}

void HorloSession::setAttributeViInt32(ViConstString terminalName, ViAttr attribute, ViInt32 value) {
    const Lock hold(_lock);
    const std::string key = getMetaDataKey(terminalName, attribute, AttrValueType::Int32);
    writeTrAttr(terminalName, key,
                getAttrData(attribute).enumeration == Enumeration::BmcaMode ? getBmcaModeStringFromEnum(value)
                                                                            : std::to_string(value));
}

void HorloSession::setAttributeViBoolean(ViConstString terminalName, ViAttr attribute, ViBoolean value) {
    const Lock hold(_lock);
    const std::string key = getMetaDataKey(terminalName, attribute, AttrValueType::Boolean);
    const std::string type = getTrType(terminalName);
    if (key == "isEnabled" && std::find(std::begin(kEnableableTypes), std::end(kEnableableTypes), type) == std::end(kEnableableTypes))
        throw ZRERR_RAISE(tiktalerr_attrReadonly).debug("func", "tiktal::HorloSession::setAttributeViBoolean");
    writeTrAttr(terminalName, key, std::to_string(value));
}

}  // namespace tiktal

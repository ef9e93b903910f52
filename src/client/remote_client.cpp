#include "client/remote_client.h"

#include <boost/lexical_cast.hpp>
#include <cjson/cJSON.h>
#include <vector>

#include "client/curl.h"
#include "errors/zrerr.h"
#include "json/helpers.h"
#include "json/zrjsonlh.h"

namespace zrhorlo {
namespace {

namespace transport = zr::vantle::shared;

constexpr char kScheme[] = "http://";
constexpr char kPrefix[] = "tiktalwebs";
constexpr char kMediaType[] = "vnd.zr.tiktal.v1/json; charset=utf-8";
constexpr std::uint32_t kTimeoutInMS = 5000;
using zrerr::kMissingParameter;
constexpr char kParseFailure[] = "Failed to parse data from a remote device.";

// Percent-encodes every byte that is not unreserved in a URI, so that no name can reach another
// resource or change the query ("/", "?", "#", "%", "&" and the rest); a space becomes "%20".
std::string encode(const std::string& text) {
    static const char kHex[] = "0123456789ABCDEF";
    std::string out;
    for (const unsigned char c : text) {
        const bool unreserved = (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z') || (c >= '0' && c <= '9') ||
                                c == '-' || c == '.' || c == '_' || c == '~';
        if (unreserved) {
            out += static_cast<char>(c);
        } else {
            out += '%';
            out += kHex[c >> 4];
            out += kHex[c & 15];
        }
    }
    return out;
}

// Runs a transport call; its network failures become the driver's statuses, keeping the
// transport's status as the nested error. Statuses the service sent pass unchanged.
template <class Call>
auto mapped(const char* function, Call&& call) -> decltype(call()) {
    try {
        return call();
    } catch (const zrerr::ExceptionBase& e) {
        const std::int32_t code = e.code();
        if (code == transport::kNetworkClientNotFoundError)
            throw ZRERR_RAISE(tiktalerr_remoteDeviceResourceNotFound).debug("function", function).cause(e);
        if (code >= -411399 && code <= -411350)
            throw ZRERR_RAISE(tiktalerr_remoteDeviceCommunicationFailure).debug("function", function).cause(e);
        if (code >= 411350 && code <= 411399)
            throw ZRERR_RAISE(tiktalerr_warn_networkClientInProgress).debug("func", function).cause(e);
        throw;
    }
}

void requireOutput(const void* out, const char* name) {
    if (!out) throw ZRERR_RAISE(tiktalerr_invParameter).debug("message", kMissingParameter).debug(name, "NULL");
}

// A JSON string of `text`, escaped as JSON requires.
std::string quoted(const std::string& text) {
    zrjsonlh::CppJson owner;
    owner.reset(cJSON_CreateString(text.c_str()));
    if (!owner.get()) throw std::bad_alloc();
    return zrjsonlh::printUnformatted(owner.get());
}

}  // namespace

RemoteClientApiWrapper::RemoteClientApiWrapper(const std::string& host, const std::string& deviceName)
    : _host(host), _deviceName(deviceName), _transport(std::make_shared<transport::tCURL>()) {
    mapped("zrhorlo::RemoteClientApiWrapper::RemoteClientApiWrapper", [&] {
        _transport->initialize(kScheme + host, kPrefix, kTimeoutInMS);
        _transport->setMediaType(kMediaType);
    });
    std::vector<std::string> devices;
    if (!zrjson::getStringArrayMember(getRemoteJsonResponse("devices"), "devices", devices))
        throw ZRERR_RAISE(tiktalerr_rsrcUnavailable)
            .debug("message", "Failed to parse the list of supported devices from the remote target.")
            .debug("deviceAddress", host);
    if (devices.empty())
        throw ZRERR_RAISE(tiktalerr_rsrcUnavailable)
            .debug("message", "The list of supported devices from the remote target is empty.")
            .debug("deviceAddress", host);
    if (devices.size() > 1)
        throw ZRERR_RAISE(tiktalerr_featureNotSupported).debug("message", "Multiple devices are not currently supported");

    // "/<anything>/<device>": the name is what follows the second "/".
    const std::string& entry = devices.front();
    const std::size_t first = entry.find('/');
    const std::size_t second = first == std::string::npos ? first : entry.find('/', first + 1);
    const std::string remoteDeviceName = second == std::string::npos ? entry : entry.substr(second + 1);
    if (remoteDeviceName == _deviceName) return;
    if (_deviceName == "system" && remoteDeviceName == "sync_1") {
        _deviceName = remoteDeviceName;
        return;
    }
    throw ZRERR_RAISE(tiktalerr_remoteDeviceResourceNotFound)
        .debug("message", "The specified path is not supported on the remote device.")
        .debug("remoteDeviceName", remoteDeviceName)
        .debug("deviceName", _deviceName)
        .debug("deviceAddress", host);
}

RemoteClientApiWrapper::~RemoteClientApiWrapper() = default;

std::string RemoteClientApiWrapper::getRemoteJsonResponse(const std::string& path) {
    return mapped("zrhorlo::RemoteClientApiWrapper::getRemoteJsonResponse", [&] { return _transport->get(path); });
}

void RemoteClientApiWrapper::getRemoteData(const std::string& path, zrjsonlh::CppJson& data) {
    if (!zrjson::getObjectMember(getRemoteJsonResponse(path), "data", data))
        throw ZRERR_RAISE(tiktalerr_rsrcUnavailable)
            .debug("message", kParseFailure)
            .debug("resourceUri", path)
            .debug("deviceAddress", _host);
}

std::string RemoteClientApiWrapper::getRemoteData(const std::string& path) {
    zrjsonlh::CppJson data;
    getRemoteData(path, data);
    return zrjsonlh::printUnformatted(data.get());
}

void RemoteClientApiWrapper::getSvcAttr(const std::string& attribute, std::string* svcAttrJsonOut) {
    requireOutput(svcAttrJsonOut, "svcAttrJsonOut");
    zrjsonlh::CppJson data;
    getSvcAttrData(attribute, data);
    *svcAttrJsonOut = zrjsonlh::printUnformatted(data.get());
}

void RemoteClientApiWrapper::getSvcAttrData(const std::string& attribute, zrjsonlh::CppJson& svcAttrOut) {
    getRemoteData(encode(_deviceName) + "?attribute=" + encode(attribute), svcAttrOut);
}

void RemoteClientApiWrapper::getTrAttrData(const std::string& trId, const std::string& attribute,
                                           zrjsonlh::CppJson& trAttrOut) {
    getRemoteData(encode(_deviceName) + "/" + encode(trId) + "/" + encode(attribute), trAttrOut);
}

void RemoteClientApiWrapper::getSvcMetadata(std::string* svcMetadataJsonOut) {
    requireOutput(svcMetadataJsonOut, "svcMetadataJsonOut");
    *svcMetadataJsonOut = getRemoteData(encode(_deviceName));
}

void RemoteClientApiWrapper::getTrAttr(const std::string& trId, const std::string& attribute, std::string* trAttrJsonOut) {
    requireOutput(trAttrJsonOut, "trAttrJsonOut");
    zrjsonlh::CppJson data;
    getTrAttrData(trId, attribute, data);
    *trAttrJsonOut = zrjsonlh::printUnformatted(data.get());
}

void RemoteClientApiWrapper::getTrMetadata(const std::string& trId, std::string* trMetadataJsonOut) {
    requireOutput(trMetadataJsonOut, "trMetadataJsonOut");
    *trMetadataJsonOut = getRemoteData(encode(_deviceName) + "/" + encode(trId));
}

std::int32_t RemoteClientApiWrapper::getApiVersion() {
    std::string data, version;
    getSvcAttr("apiVersion", &data);
    if (!zrjson::getStringMember(data, "apiVersion", version))
        throw ZRERR_RAISE(tiktalerr_rsrcUnavailable).debug("message", kParseFailure).debug("deviceAddress", _host);
    try {
        return boost::lexical_cast<std::int32_t>(version);
    } catch (const boost::bad_lexical_cast&) {
        throw ZRERR_RAISE(tiktalerr_readFailure).debug("message", "Failed to cast a string representation of apiVersion to int.");
    }
}

bool RemoteClientApiWrapper::getSvcAttrText(const char* key, std::string& out) {
    zrjsonlh::CppJson data;
    getSvcAttrData(key, data);
    const cJSON* member = cJSON_GetObjectItem(data.get(), key);
    if (!member)
        throw ZRERR_RAISE(zrhorloerr_attrNotFound)
            .debug("message", kParseFailure)
            .debug("deviceAddress", _host)
            .debug("jsonReceived", zrjsonlh::printUnformatted(data.get()))
            .debug("desiredJsonKey", key);
    if (cJSON_IsNull(member)) return false;
    try {
        out = zrjsonlh::getString(member);
    } catch (const zrerr::ExceptionBase& e) {
        throw ZRERR_RAISE(zrhorloerr_attrNotFound)
            .debug("message", "Failed to parse JSON value as a string.")
            .debug("jsonReceived", zrjsonlh::printUnformatted(data.get()))
            .debug("desiredJsonKey", key)
            .debug("originalErrorCode", e.code());
    }
    return true;
}

bool RemoteClientApiWrapper::getSelectedTrId(std::string* selectedTrIdOut) {
    requireOutput(selectedTrIdOut, "selectedTrIdOut");
    return getSvcAttrText("selectedTrId", *selectedTrIdOut);
}

bool RemoteClientApiWrapper::getSelectedTrOffsetNanos(std::int64_t* selectedTrOffsetNanosOut) {
    requireOutput(selectedTrOffsetNanosOut, "selectedTrOffsetNanosOut");
    std::string text;
    if (!getSvcAttrText("selectedTrOffsetNanos", text)) return false;
    try {
        *selectedTrOffsetNanosOut = boost::lexical_cast<std::int64_t>(text);
    } catch (const boost::bad_lexical_cast&) {
        throw ZRERR_RAISE(zrhorloerr_attrNotFound)
            .debug("message", "Failed to cast a string representation of selectedTrOffsetNanos to int64_t.")
            .debug("deviceAddress", _host)
            .debug("jsonReceived", text)
            .debug("desiredJsonKey", "selectedTrOffsetNanos");
    }
    return true;
}

void RemoteClientApiWrapper::setTrAttr(const std::string& trId, const std::string& attribute, const std::string& value) {
    const std::string path = encode(_deviceName) + "/" + encode(trId) + "/" + encode(attribute);
    const std::string body = R"({"version":1,"data":{)" + quoted(attribute) + ":" + quoted(value) + "}}";
    mapped("zrhorlo::RemoteClientApiWrapper::setTrAttr", [&] { _transport->put(path, body); });
}

void RemoteClientApiWrapper::persistConfig() {
    const std::string path = encode(_deviceName) + "/persist";
    mapped("zrhorlo::RemoteClientApiWrapper::persistConfig", [&] { _transport->put(path, ""); });
}

void RemoteClientApiWrapper::restartSvc() {
    throw ZRERR_RAISE(tiktalerr_featureNotSupported).debug("message", "Restarting the service remotely is not currently supported.");
}

void RemoteClientApiWrapper::bringDownSvc() {
    throw ZRERR_RAISE(tiktalerr_featureNotSupported)
        .debug("message", "Bringing down the service remotely is not currently supported.");
}

void RemoteClientApiWrapper::bringUpSvc() {
    throw ZRERR_RAISE(tiktalerr_featureNotSupported).debug("message", "Bringing up the service remotely is not currently supported.");
}

void RemoteClientApiWrapper::restartTr(const std::string& trId) {
    throw ZRERR_RAISE(tiktalerr_rsrcUnavailable)
        .debug("message", "Restarting a TR remotely is not currently supported.")
        .debug("trId", trId);
}

ViStatus RemoteClientApiWrapper::adjustTime(ViUInt64, ViUInt64) {
    throw ZRERR_RAISE(tiktalerr_rsrcUnavailable).debug("message", "Remote adjustTime() calls are not currently supported.");
}

}  // namespace zrhorlo

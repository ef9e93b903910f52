// Time references, time, persistence and the operations a time service refuses.
#include <boost/lexical_cast.hpp>

#include "client/remote_client.h"
#include "errors/zrerr.h"
#include "json/helpers.h"
#include "json/zrjsonlh.h"
#include "tsession/horlo_session.h"

namespace tiktal {
namespace {

using Lock = std::lock_guard<std::mutex>;
constexpr std::uint64_t kNanosPerSecond = 1000000000;

}  // namespace

const cJSON* HorloSession::timeReferenceList(zrjsonlh::CppJson& data) {
    client->getSvcAttrData("allTimeReferences", data);
    const cJSON* names = zrjsonlh::getObjectItem(data.get(), "allTimeReferences");
    return cJSON_IsArray(names) || cJSON_IsObject(names) ? names : nullptr;  // a scalar has no elements
}

std::vector<std::string> HorloSession::timeReferenceNames() {
    zrjsonlh::CppJson data;
    std::vector<std::string> list;
    if (const cJSON* names = timeReferenceList(data))
        for (auto it = zrjsonlh::ArrayIterator::begin(names); it != zrjsonlh::ArrayIterator::end(); ++it)
            list.push_back(zrjsonlh::getString(*it));
    return list;
}

void HorloSession::getTimeReferenceNames(std::string& valueString) {
    const Lock hold(_lock);
    zrjsonlh::CppJson data;
    std::string joined;
    const char* separator = "";  // "," before every name but the first
    if (const cJSON* names = timeReferenceList(data))
        for (auto it = zrjsonlh::ArrayIterator::begin(names); it != zrjsonlh::ArrayIterator::end(); ++it) {
            zrjsonlh::checkString(*it);
            joined.append(separator).append((*it)->valuestring);
            separator = ",";
        }
    valueString = std::move(joined);
}

void HorloSession::getTime(ViUInt32* timeSeconds, ViUInt32* timeNanoseconds, ViUInt16* timeFractionalNanoseconds) {
    if (!timeSeconds || !timeNanoseconds || !timeFractionalNanoseconds)
        throw ZRERR_RAISE(tiktalerr_invParameter)
            .debug("message", zrerr::kMissingParameter)
            .debug("func", "tiktal::HorloSession::getTime");
    const Lock hold(_lock);
    zrjsonlh::CppJson data;
    std::string text;
    client->getSvcAttrData("epochOffsetInNsec", data);
    if (!zrjson::getStringMember(data.get(), "epochOffsetInNsec", text))
        throw ZRERR_RAISE(tiktalerr_internalSoftware)
            .debug("message", "Failed to parse attribute from Horlo metadata.")
            .debug("json", zrjsonlh::printUnformatted(data.get()))
            .debug("key", "epochOffsetInNsec");
    // The count is never negative: "-0" is 0, and "-n" fails as any other text that is no count.
    const std::uint64_t nanos = boost::lexical_cast<std::uint64_t>(text);
    if (nanos != 0 && !text.empty() && text[0] == '-') throw boost::bad_lexical_cast();
    const std::uint64_t seconds = nanos / kNanosPerSecond;
    if (seconds > 4294967295u) throw ZRERR_RAISE(tiktalerr_overflow).debug("func", "tiktal::HorloSession::getTime");
    *timeSeconds = static_cast<ViUInt32>(seconds);
    *timeNanoseconds = static_cast<ViUInt32>(nanos - seconds * kNanosPerSecond);
    *timeFractionalNanoseconds = 0;
}

void HorloSession::adjustTimeBeta(ViUInt64 timeReferenceNanos, ViUInt64 timeKeeperNanos) {
    const Lock hold(_lock);
    const ViStatus status = client->adjustTime(timeReferenceNanos, timeKeeperNanos);
    if (status != VI_SUCCESS)
        throw zrerr::raise(status, "retVal", ZRERR_FILE, __LINE__).debug("message", "Adjust Time call failed");
}

void HorloSession::persistConfig() {
    const Lock hold(_lock);
    client->persistConfig();
}

void HorloSession::reset() {
    const Lock hold(_lock);
    client->restartSvc();
}

void HorloSession::bringDownSvc() {
    const Lock hold(_lock);
    client->bringDownSvc();
}

void HorloSession::bringUpSvc() {
    const Lock hold(_lock);
    client->bringUpSvc();
}

}  // namespace tiktal

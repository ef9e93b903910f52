// The session of a remote time service ("sync://HOST/DEVICE"). It holds no device state: every
// call asks the service, through one REST client that the session's lock keeps to one call at a
// time.
#pragma once

#include <cjson/cJSON.h>

#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "sessions/session.h"
#include "tsession/attr_dict.h"

namespace zrhorlo {
class RemoteClientApiWrapper;
}
namespace zrjsonlh {
class CppJson;
}

namespace tiktal {

class HorloSession final : public Session {
public:
    explicit HorloSession(const char* resourceName);
    ~HorloSession() override;

    void getAttributeViBoolean(ViConstString terminalName, ViAttr attribute, ViBoolean* value) override;
    void setAttributeViString(ViConstString terminalName, ViAttr attribute, ViConstString value) override;
    void persistConfig() override;
    void getTime(ViUInt32* timeSeconds, ViUInt32* timeNanoseconds, ViUInt16* timeFractionalNanoseconds) override;
    void setAttributeViBoolean(ViConstString terminalName, ViAttr attribute, ViBoolean value) override;
    void adjustTimeBeta(ViUInt64 timeReferenceNanos, ViUInt64 timeKeeperNanos) override;
    void getTimeReferenceNames(std::string& valueString) override;
    void getAttributeViInt32(ViConstString terminalName, ViAttr attribute, ViInt32* value) override;
    void setAttributeViInt32(ViConstString terminalName, ViAttr attribute, ViInt32 value) override;
    void reset() override;
    void getAttributeViReal64(ViConstString terminalName, ViAttr attribute, ViReal64* value) override;
    void getAttributeViString(ViConstString terminalName, ViAttr attribute, std::string& valueString) override;
    virtual void bringDownSvc();
    virtual void bringUpSvc();

private:
    // The JSON key of `attribute` for this call, after the dictionary's checks.
    std::string getMetaDataKey(ViConstString terminalName, ViAttr attribute, AttrValueType valueType);
    std::string getTrType(ViConstString trName);
    std::string getSelectedTrType();
    std::string getSelectedTrId();  // empty when none is selected
    std::int64_t getSelectedTrOffsetNanos();  // 0 when none is selected
    // The parsed answer for `key` of the time reference `terminalName`, into `data`.
    void getTrAttr(ViConstString terminalName, const std::string& key, zrjsonlh::CppJson& data);
    // The text member `key`; a missing one fails with `missing` as its message (null: the usual).
    std::string readTrAttrText(ViConstString terminalName, const std::string& key, const char* missing = nullptr);
    void writeTrAttr(ViConstString terminalName, const std::string& key, const std::string& valueText);
    // The service's "allTimeReferences" member, held by `data`; null for a scalar, which lists none.
    const cJSON* timeReferenceList(zrjsonlh::CppJson& data);
    std::vector<std::string> timeReferenceNames();

    std::string resourceName;
    std::unique_ptr<zrhorlo::RemoteClientApiWrapper> client;
    std::mutex _lock;  // one call at a time reaches the client
};

std::unique_ptr<Session> createHorloSession(const char* resourceName);

}  // namespace tiktal

// The REST client of the time service: each operation is one GET or PUT under "tiktalwebs".
#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include <tiktal/tiktal.h>

namespace zr::vantle::shared {
class iCURL;
}
namespace zrjsonlh {
class CppJson;
}

namespace zrhorlo {

// Status of an attribute the service does not hold right now; reported as 0xBFFA406E.
inline constexpr std::int32_t zrhorloerr_attrNotFound = static_cast<std::int32_t>(0xBFFA8502);

class ApiWrapperInterface {
public:
    virtual ~ApiWrapperInterface() = default;
    virtual std::int32_t getApiVersion() = 0;
    // False, with the output untouched, when the service has no selection.
    virtual bool getSelectedTrId(std::string* selectedTrIdOut) = 0;
    virtual bool getSelectedTrOffsetNanos(std::int64_t* selectedTrOffsetNanosOut) = 0;
    // The "data" object of the answer, as unformatted JSON.
    virtual void getSvcAttr(const std::string& attribute, std::string* svcAttrJsonOut) = 0;
    virtual void getSvcMetadata(std::string* svcMetadataJsonOut) = 0;
    virtual void getTrAttr(const std::string& trId, const std::string& attribute, std::string* trAttrJsonOut) = 0;
    virtual void getTrMetadata(const std::string& trId, std::string* trMetadataJsonOut) = 0;
    virtual void setTrAttr(const std::string& trId, const std::string& attribute, const std::string& value) = 0;
    virtual void restartSvc() = 0;
    virtual void bringDownSvc() = 0;
    virtual void bringUpSvc() = 0;
    virtual void persistConfig() = 0;
    virtual void restartTr(const std::string& trId) = 0;
    virtual ViStatus adjustTime(ViUInt64 timeReferenceNanos, ViUInt64 timeKeeperNanos) = 0;
};

class RemoteClientApiWrapper final : public ApiWrapperInterface {
public:
    // Opens the transport and confirms that the service offers `deviceName` ("system" stands
    // for the service's one device "sync_1").
    RemoteClientApiWrapper(const std::string& host, const std::string& deviceName);
    ~RemoteClientApiWrapper() override;

    std::int32_t getApiVersion() override;
    bool getSelectedTrId(std::string* selectedTrIdOut) override;
    bool getSelectedTrOffsetNanos(std::int64_t* selectedTrOffsetNanosOut) override;
    void getSvcAttr(const std::string& attribute, std::string* svcAttrJsonOut) override;
    void getSvcMetadata(std::string* svcMetadataJsonOut) override;
    void getTrAttr(const std::string& trId, const std::string& attribute, std::string* trAttrJsonOut) override;
    void getTrMetadata(const std::string& trId, std::string* trMetadataJsonOut) override;
    void setTrAttr(const std::string& trId, const std::string& attribute, const std::string& value) override;
    void restartSvc() override;
    void bringDownSvc() override;
    void bringUpSvc() override;
    void persistConfig() override;
    void restartTr(const std::string& trId) override;
    ViStatus adjustTime(ViUInt64 timeReferenceNanos, ViUInt64 timeKeeperNanos) override;

    // getSvcAttr and getTrAttr with the "data" object parsed, for the session, which reads its
    // members: a text would only be parsed again.
    void getSvcAttrData(const std::string& attribute, zrjsonlh::CppJson& svcAttrOut);
    void getTrAttrData(const std::string& trId, const std::string& attribute, zrjsonlh::CppJson& trAttrOut);

    const std::string& deviceName() const { return _deviceName; }

private:
    std::string getRemoteJsonResponse(const std::string& path);
    void getRemoteData(const std::string& path, zrjsonlh::CppJson& data);
    std::string getRemoteData(const std::string& path);
    // The text of a nullable string member of a service attribute; false when it is null.
    bool getSvcAttrText(const char* key, std::string& out);

    std::string _host;
    std::string _deviceName;
    std::shared_ptr<zr::vantle::shared::iCURL> _transport;
};

}  // namespace zrhorlo

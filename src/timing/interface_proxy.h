// The device interface proxy: requests to the timing module's driver over the handle opened from
// its interface path, each reporting into a platform status record by the chaining rule (an error
// already in the record makes every operation a no-op; a warning gives way to an error).
#pragma once

#include <cstdint>
#include <string>
#include <thread>

#include "errors/tstatus.h"
#include "platform/platform.h"
#include "timing/packet.h"

namespace tiktal::nZRAPAL000 {

// Merges the status of an operating-system error, with where it was met.
void mapOsError(int error, nZRAPALS100::tStatus& status, const char* file, std::uint32_t line) noexcept;

class iInterfaceProxy;

// One driver wait, from beginWait to endWait; owned by the caller.
struct tWaitContext {
    tWaitContext() = default;
    tWaitContext(const tWaitContext&) = delete;
    tWaitContext& operator=(const tWaitContext&) = delete;
    ~tWaitContext();  // a wait still armed is abandoned and its thread joined

    std::thread waiter;
    iInterfaceProxy* proxy = nullptr;
    nZRAPALS100::tStatus status;  // what the waiter thread met
    std::uint8_t request[24] = {};
    std::uint32_t waitId = 0;     // 0: no wait armed
    platform::DeviceWait wait;    // the wait's own connection to the driver
};

class iInterfaceProxy {
public:
    virtual ~iInterfaceProxy() = default;
    virtual void close() = 0;
    // The number of output bytes the driver returned.
    virtual std::uint32_t ioControl(std::uint32_t code, const void* in, std::uint32_t inSize, void* out,
                                    std::uint32_t outSize, nZRAPALS100::tStatus& status) = 0;
    virtual std::uint32_t read(void* buffer, std::uint32_t size, nZRAPALS100::tStatus& status) = 0;
    virtual std::uint32_t write(const void* buffer, std::uint32_t size, nZRAPALS100::tStatus& status) = 0;
    // Arms a wait and returns its identifier (0: none armed); a thread waits for it to end.
    virtual std::uint32_t beginWait(std::uint16_t arg1, std::uint32_t arg2, std::uint8_t arg3, tWaitContext& context,
                                    nZRAPALS100::tStatus& status) = 0;
    // Cancels the wait of `context` and waits for its thread; nothing when none is armed.
    virtual void endWait(tWaitContext& context) = 0;
};

class tDeviceInterfaceProxy : public virtual iInterfaceProxy {
public:
    tDeviceInterfaceProxy() = default;
    ~tDeviceInterfaceProxy() override;

    void close() override;
    std::uint32_t ioControl(std::uint32_t code, const void* in, std::uint32_t inSize, void* out, std::uint32_t outSize,
                            nZRAPALS100::tStatus& status) override;
    std::uint32_t read(void* buffer, std::uint32_t size, nZRAPALS100::tStatus& status) override;
    std::uint32_t write(const void* buffer, std::uint32_t size, nZRAPALS100::tStatus& status) override;
    std::uint32_t beginWait(std::uint16_t arg1, std::uint32_t arg2, std::uint8_t arg3, tWaitContext& context,
                            nZRAPALS100::tStatus& status) override;
    void endWait(tWaitContext& context) override;

    virtual bool isOpen() const;
    // Opens the proxy on a device's interface path; a failure leaves it closed.
    void open(const std::string& path, nZRAPALS100::tStatus& status) { openDevice(path, status); }

protected:
    virtual void openDevice(const std::string& path, nZRAPALS100::tStatus& status);

    // Sends one request of the table: false, with the failure merged into `status`, when the system
    // call failed or the driver's answer is not the size of the output packet.
    bool request(std::uint32_t code, const PacketWriter& in, std::uint8_t* out, std::uint32_t outSize,
                 nZRAPALS100::tStatus& status);
    // The driver's status for an operation (the trailing field of its output).
    static void mergeDriverStatus(std::int32_t code, nZRAPALS100::tStatus& status, const char* file, std::uint32_t line);
    static void mergeNullArgument(nZRAPALS100::tStatus& status, const char* file, std::uint32_t line);

private:
    platform::DeviceChannel _channel;
};

}  // namespace tiktal::nZRAPAL000

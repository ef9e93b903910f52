#include "timing/interface_proxy.h"

#include <cstring>
#include <future>
#include <memory>
#include <system_error>

#include "deviceRequests.h"
#include "errors/zrerr.h"

namespace tiktal::nZRAPAL000 {
namespace {

constexpr char kComponent[] = "tiktal_impl";
constexpr std::int32_t kInvalidParameter = -52005;
constexpr std::int32_t kInternalError = -52008;

}  // namespace

void mapOsError(int error, nZRAPALS100::tStatus& status, const char* file, std::uint32_t line) noexcept {
    status.merge(platform::statusOfOsError(error), kComponent, file, line);
}

tWaitContext::~tWaitContext() {
    if (!waiter.joinable()) return;
    wait.abandon();
    waiter.join();
}

tDeviceInterfaceProxy::~tDeviceInterfaceProxy() = default;

bool tDeviceInterfaceProxy::isOpen() const { return _channel.isOpen(); }

void tDeviceInterfaceProxy::openDevice(const std::string& path, nZRAPALS100::tStatus& status) {
    if (status.isError()) return;
    if (const int error = _channel.open(path)) mapOsError(error, status, ZRERR_FILE, __LINE__);
}

void tDeviceInterfaceProxy::close() { _channel.close(); }

std::uint32_t tDeviceInterfaceProxy::ioControl(std::uint32_t code, const void* in, std::uint32_t inSize, void* out,
                                               std::uint32_t outSize, nZRAPALS100::tStatus& status) {
    if (status.isError()) return 0;
    std::uint32_t returned = 0;
    if (const int error = _channel.control(code, in, inSize, out, outSize, returned))
        mapOsError(error, status, ZRERR_FILE, __LINE__);
    return returned;
}

// The driver's transport carries control requests only.
std::uint32_t tDeviceInterfaceProxy::read(void*, std::uint32_t, nZRAPALS100::tStatus& status) {
    if (!status.isError()) mapOsError(platform::error::kNotSupported, status, ZRERR_FILE, __LINE__);
    return 0;
}

std::uint32_t tDeviceInterfaceProxy::write(const void*, std::uint32_t, nZRAPALS100::tStatus& status) {
    if (!status.isError()) mapOsError(platform::error::kNotSupported, status, ZRERR_FILE, __LINE__);
    return 0;
}

bool tDeviceInterfaceProxy::request(std::uint32_t code, const PacketWriter& in, std::uint8_t* out,
                                    std::uint32_t outSize, nZRAPALS100::tStatus& status) {
    nZRAPALS100::tStatus call;
    const std::uint32_t returned = ioControl(code, in.data(), in.size(), out, outSize, call);
    if (call.isError()) {
        status.merge(call);
        return false;
    }
    if (returned != outSize) {  // a driver that answers less than the packet has answered nothing
        status.merge(kInternalError, kComponent, ZRERR_FILE, __LINE__);
        return false;
    }
    return true;
}

void tDeviceInterfaceProxy::mergeDriverStatus(std::int32_t code, nZRAPALS100::tStatus& status, const char* file,
                                              std::uint32_t line) {
    status.merge(code, kComponent, file, line);
}

void tDeviceInterfaceProxy::mergeNullArgument(nZRAPALS100::tStatus& status, const char* file, std::uint32_t line) {
    status.merge(kInvalidParameter, kComponent, file, line);
}

// On this transport the wait request goes out on a connection of its own, and the driver answers
// the armed identifier in a first message (standing in for the identifier cell and the event of
// the packet, which stay in it for the driver's record); the thread then waits for the second.
std::uint32_t tDeviceInterfaceProxy::beginWait(std::uint16_t arg1, std::uint32_t arg2, std::uint8_t arg3,
                                               tWaitContext& context, nZRAPALS100::tStatus& status) {
    if (status.isError()) return 0;
    context.proxy = this;
    context.status = nZRAPALS100::tStatus();
    auto identifier = std::make_shared<std::uint64_t>(0);
    PacketWriter packet(tiktalq300::requests::kWaitInputSize);
    packet.u64(reinterpret_cast<std::uintptr_t>(identifier.get()));
    packet.u64(0);  // no event handle: the armed message is the event
    packet.u32(arg2);
    packet.u16(arg1);
    packet.u8(arg3);
    packet.u8(0);
    std::memcpy(context.request, packet.data(), sizeof context.request);

    auto armed = std::make_shared<std::promise<void>>();
    std::future<void> armedEvent = armed->get_future();
    const std::string path = _channel.path();
    try {
        context.waiter = std::thread([&context, path, identifier, armed] {
            const int error = context.wait.arm(path, tiktalq300::requests::kWaitCode, context.request,
                                               sizeof context.request, *identifier);
            if (error) mapOsError(error, context.status, ZRERR_FILE, __LINE__);
            const bool waiting = error == 0 && *identifier != 0;
            armed->set_value();
            if (!waiting) return;
            // A cancelled wait has ended as asked; anything else is a failure of the driver.
            const int ended = context.wait.awaitEnd();
            if (ended != 0 && ended != platform::error::kCancelled) mapOsError(ended, context.status, ZRERR_FILE, __LINE__);
        });
    } catch (const std::system_error& e) {
        mapOsError(e.code().value(), status, ZRERR_FILE, __LINE__);
        return 0;
    }
    armedEvent.wait();
    context.waitId = static_cast<std::uint32_t>(*identifier);
    if (context.waitId == 0) {
        context.waiter.join();
        status.merge(context.status);
    }
    return context.waitId;
}

void tDeviceInterfaceProxy::endWait(tWaitContext& context) {
    if (context.waitId == 0) return;
    PacketWriter cancel(tiktalq300::requests::kCancelWaitInputSize);
    cancel.u32(context.waitId);
    cancel.u32(0);
    nZRAPALS100::tStatus call;
    ioControl(tiktalq300::requests::kCancelWaitCode, cancel.data(), cancel.size(), nullptr, 0, call);
    if (call.isError()) context.wait.abandon();  // the driver cannot end the wait: stop waiting for it
    if (context.waiter.joinable()) context.waiter.join();
    context.waitId = 0;
}

}  // namespace tiktal::nZRAPAL000

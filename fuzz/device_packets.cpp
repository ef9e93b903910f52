// The device daemon's decoding of request messages (u32 control code, u32 output size, input
// packet), as the daemon receives them from any peer.
//
// A message is either refused with EINVAL or decodes to a request whose code and output size are
// the message's header and whose input is exactly the rest of the message, of the size that request
// takes, with room for its output. The packet field readers return 0 beyond a packet's end, and an
// answer's byte count is the number of output bytes after it.
#include <cerrno>
#include <cstdint>
#include <cstring>
#include <vector>

#include "property.h"
#include "wire.h"

namespace {

using tiktalfuzz::require;
namespace requests = tiktalq300::requests;

std::uint32_t headerField(const std::uint8_t* data, std::size_t offset) {
    return static_cast<std::uint32_t>(data[offset]) | static_cast<std::uint32_t>(data[offset + 1]) << 8 |
           static_cast<std::uint32_t>(data[offset + 2]) << 16 | static_cast<std::uint32_t>(data[offset + 3]) << 24;
}

void checkRequest(const devd::Request& request, const std::uint8_t* data, std::size_t size) {
    require(size >= devd::kHeaderSize, "a request has a whole header");
    require(request.code == headerField(data, 0), "the code is the message's");
    require(request.outputSize == headerField(data, 4), "the output size is the message's");
    require(request.input.size() == size - devd::kHeaderSize &&
                std::memcmp(request.input.data(), data + devd::kHeaderSize, request.input.size()) == 0,
            "the input is the rest of the message");
    switch (request.kind) {
        case devd::Kind::Wait:
            require(request.code == requests::kWaitCode && request.input.size() == requests::kWaitInputSize, "a wait");
            break;
        case devd::Kind::Cancel:
            require(request.code == requests::kCancelWaitCode && request.input.size() == requests::kCancelWaitInputSize,
                    "a cancel");
            break;
        case devd::Kind::Table:
            require(request.entry && request.entry == devd::findRequest(request.code), "a request of the table");
            require(request.input.size() == request.entry->inputSize, "the input has the request's size");
            require(request.outputSize >= request.entry->outputSize, "the caller has room for the output");
            break;
    }
}

void checkFields(const devd::Bytes& packet) {
    for (std::size_t offset = packet.size() < 8 ? 0 : packet.size() - 8; offset <= packet.size() + 8; ++offset) {
        if (offset + 4 > packet.size()) require(devd::readU32(packet, offset) == 0, "nothing is read past the end");
        if (offset + 8 > packet.size()) require(devd::readU64(packet, offset) == 0, "nothing is read past the end");
    }
}

void checkAnswer(const devd::Bytes& output) {
    const devd::Bytes answer = devd::encodeAnswer(EINVAL, output);
    require(answer.size() == devd::kHeaderSize + output.size(), "an answer is its header and its output");
    require(devd::readU32(answer, 4) == output.size(), "the byte count counts the output");
    require(static_cast<std::int32_t>(devd::readU32(answer, 0)) == EINVAL, "the OS error leads");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    // A copy of exactly the message's size, so that a read past its end is caught.
    const std::vector<std::uint8_t> message(data, data + size);
    const devd::Decoded decoded = devd::decode(message.data(), message.size());
    require(decoded.hasHeader == (size >= devd::kHeaderSize), "the header is read when it is whole");
    if (decoded.refusal != 0) {
        require(decoded.refusal == EINVAL, "a refusal is EINVAL");
        return 0;
    }
    checkRequest(decoded.request, message.data(), message.size());
    checkFields(decoded.request.input);
    checkAnswer(decoded.request.input);
    return 0;
}

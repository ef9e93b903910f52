// The library's decoding of a driver's answer messages (i32 error number, u32 bytes returned, the
// output), as they come from a daemon that may send anything. The first input byte is the output
// room the request had; the rest is the message as received.
//
// An answer is accepted (0 or an error number from 1 to 4095 other than a pending one) exactly
// when its count is the number of bytes after the header and they fit the room; then the output is
// those bytes. Anything else copies nothing: EPROTO, or EBADMSG for a pending answer.
#include <cerrno>
#include <cstdint>
#include <cstring>
#include <vector>

#include "platform/platform.h"
#include "property.h"

using tiktalfuzz::require;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size == 0) return 0;
    const std::uint32_t room = data[0];
    const std::uint8_t* message = data + 1;
    const std::size_t received = size - 1;
    std::vector<std::uint8_t> out(room, 0xA5);
    std::uint32_t returned = 77;
    const int result = platform::decodeDriverAnswer(message, received, out.data(), room, returned);

    const bool framed = received >= 8 && received - 8 <= room &&
                        (message[4] | message[5] << 8 | message[6] << 16 | std::uint32_t{message[7]} << 24) == received - 8;
    const std::uint32_t error = framed ? (message[0] | message[1] << 8 | message[2] << 16 | std::uint32_t{message[3]} << 24) : 0;
    const bool pending = error == EAGAIN || error == EINPROGRESS;
    const bool accepted = framed && error <= 4095 && !pending;
    if (accepted) {
        require(result == static_cast<int>(error), "an accepted answer gives its error number");
        require(returned == received - 8, "the output is the bytes after the header");
        require(returned == 0 || std::memcmp(out.data(), message + 8, returned) == 0, "the output is copied as sent");
    } else {
        require(result == (framed && pending ? EBADMSG : EPROTO), "a refused answer is malformed or pending");
        require(returned == 0, "a refused answer returns nothing");
    }
    for (std::size_t i = accepted ? returned : 0; i < room; ++i) require(out[i] == 0xA5, "nothing beyond the output is written");
    return 0;
}

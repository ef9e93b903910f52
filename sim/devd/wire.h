// The device socket's wire format, as pure functions over bytes: decoding one request message into
// a request or a refusal, encoding one answer, and reading and writing little-endian packet fields.
//
// A request message is u32 control code, u32 output size (the room the caller has), then the input
// packet. An answer is i32 OS error (0 or a Linux errno value), u32 bytes returned, then that many
// output bytes. Nothing here reads outside the bytes it is given.
#pragma once

#include "deviceRequests.h"

#include <cstddef>
#include <cstdint>
#include <vector>

namespace devd {

using Bytes = std::vector<std::uint8_t>;

// The header of a request message: control code and output size.
inline constexpr std::size_t kHeaderSize = 8;

enum class Kind {
    Table,   // one of the requests of deviceRequests.h: input and output packets of fixed sizes
    Wait,    // a driver wait (kWaitCode)
    Cancel,  // the cancel of a driver wait (kCancelWaitCode)
};

struct Request {
    std::uint32_t code = 0;
    std::uint32_t outputSize = 0;  // the room the caller has for output bytes
    Kind kind = Kind::Table;
    const tiktalq300::requests::Request* entry = nullptr;  // the table's row when kind is Table
    Bytes input;                                           // the input packet, as received
};

// What a message decodes to: a request, or a refusal with the OS error to answer (EINVAL).
struct Decoded {
    int refusal = 0;
    bool hasHeader = false;  // code and outputSize below are the message's own, even when refused
    Request request;
};

// Decodes one message of `size` bytes. Refused (EINVAL): a message shorter than the header, an
// unknown control code, an input packet whose size is not the request's, or an output size below
// the request's output packet.
Decoded decode(const std::uint8_t* message, std::size_t size);

// The answer message: OS error, the number of output bytes, the output bytes.
Bytes encodeAnswer(std::int32_t osError, const Bytes& output = {});

// Field access at a byte offset; reading outside `packet` yields 0 and writing outside it does
// nothing, so a caller's slip can never reach past a packet's end.
std::uint32_t readU32(const Bytes& packet, std::size_t offset);
std::uint64_t readU64(const Bytes& packet, std::size_t offset);
void writeU32(Bytes& packet, std::size_t offset, std::uint32_t value);
void writeU64(Bytes& packet, std::size_t offset, std::uint64_t value);

// The trailing i32 of a packet: the caller's status in an input, the driver's status in an output.
std::int32_t trailingStatus(const Bytes& packet);
void setTrailingStatus(Bytes& packet, std::int32_t status);

// The table's row for a control code; null when the code is not in the table.
const tiktalq300::requests::Request* findRequest(std::uint32_t code);

}  // namespace devd

#include "wire.h"

#include <algorithm>
#include <cerrno>

namespace devd {
namespace {

using tiktalq300::requests::kCancelWaitCode;
using tiktalq300::requests::kCancelWaitInputSize;
using tiktalq300::requests::kWaitCode;
using tiktalq300::requests::kWaitInputSize;

std::uint64_t readLittleEndian(const std::uint8_t* bytes, std::size_t width) {
    std::uint64_t value = 0;
    for (std::size_t i = width; i-- > 0;) value = (value << 8) | bytes[i];
    return value;
}

void writeLittleEndian(Bytes& packet, std::size_t offset, std::uint64_t value, std::size_t width) {
    if (offset > packet.size() || packet.size() - offset < width) return;
    for (std::size_t i = 0; i < width; ++i) packet[offset + i] = static_cast<std::uint8_t>(value >> (8 * i));
}

std::uint64_t readField(const Bytes& packet, std::size_t offset, std::size_t width) {
    if (offset > packet.size() || packet.size() - offset < width) return 0;
    return readLittleEndian(packet.data() + offset, width);
}

Decoded refused(Decoded decoded) {
    decoded.refusal = EINVAL;
    return decoded;
}

}  // namespace

const tiktalq300::requests::Request* findRequest(std::uint32_t code) {
    for (const auto& entry : tiktalq300::requests::kRequests)
        if (entry.code == code) return &entry;
    return nullptr;
}

Decoded decode(const std::uint8_t* message, std::size_t size) {
    Decoded decoded;
    if (size < kHeaderSize) return refused(std::move(decoded));
    Request& request = decoded.request;
    decoded.hasHeader = true;
    request.code = static_cast<std::uint32_t>(readLittleEndian(message, 4));
    request.outputSize = static_cast<std::uint32_t>(readLittleEndian(message + 4, 4));
    const std::size_t inputSize = size - kHeaderSize;

    std::size_t expectedInput = 0;
    if (request.code == kWaitCode) {
        request.kind = Kind::Wait;
        expectedInput = kWaitInputSize;
    } else if (request.code == kCancelWaitCode) {
        request.kind = Kind::Cancel;
        expectedInput = kCancelWaitInputSize;
    } else {
        request.entry = findRequest(request.code);
        if (!request.entry || request.outputSize < request.entry->outputSize) return refused(std::move(decoded));
        expectedInput = request.entry->inputSize;
    }
    if (inputSize != expectedInput) return refused(std::move(decoded));
    request.input.assign(message + kHeaderSize, message + size);
    return decoded;
}

Bytes encodeAnswer(std::int32_t osError, const Bytes& output) {
    Bytes answer(kHeaderSize + output.size());
    writeLittleEndian(answer, 0, static_cast<std::uint32_t>(osError), 4);
    writeLittleEndian(answer, 4, output.size(), 4);
    std::copy(output.begin(), output.end(), answer.begin() + kHeaderSize);
    return answer;
}

std::uint32_t readU32(const Bytes& packet, std::size_t offset) {
    return static_cast<std::uint32_t>(readField(packet, offset, 4));
}

std::uint64_t readU64(const Bytes& packet, std::size_t offset) { return readField(packet, offset, 8); }

void writeU32(Bytes& packet, std::size_t offset, std::uint32_t value) { writeLittleEndian(packet, offset, value, 4); }

void writeU64(Bytes& packet, std::size_t offset, std::uint64_t value) { writeLittleEndian(packet, offset, value, 8); }

std::int32_t trailingStatus(const Bytes& packet) {
    return packet.size() < 4 ? 0 : static_cast<std::int32_t>(readU32(packet, packet.size() - 4));
}

void setTrailingStatus(Bytes& packet, std::int32_t status) {
    if (packet.size() >= 4) writeU32(packet, packet.size() - 4, static_cast<std::uint32_t>(status));
}

}  // namespace devd

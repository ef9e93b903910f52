// Request packets of the timing module's driver, written and read field by field in little-endian
// order, whatever the byte order of the processor.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

namespace tiktal::nZRAPAL000 {

class PacketWriter {
public:
    explicit PacketWriter(std::size_t size) { _bytes.reserve(size); }
    void u32(std::uint32_t value) { put(value, 4); }
    void i32(std::int32_t value) { put(static_cast<std::uint32_t>(value), 4); }
    void u64(std::uint64_t value) { put(value, 8); }
    void u16(std::uint16_t value) { put(value, 2); }
    void u8(std::uint8_t value) { put(value, 1); }
    void pad() { put(0, 4); }
    const std::uint8_t* data() const noexcept { return _bytes.data(); }
    std::uint32_t size() const noexcept { return static_cast<std::uint32_t>(_bytes.size()); }

private:
    void put(std::uint64_t value, int bytes) {
        for (int i = 0; i < bytes; ++i) _bytes.push_back(static_cast<std::uint8_t>(value >> (8 * i)));
    }
    std::vector<std::uint8_t> _bytes;
};

// Reads the fields of an output packet in order; the caller sizes the packet for its fields.
class PacketReader {
public:
    explicit PacketReader(const std::uint8_t* bytes) noexcept : _at(bytes) {}
    std::uint32_t u32() noexcept {
        std::uint32_t value = 0;
        for (int i = 3; i >= 0; --i) value = (value << 8) | _at[i];
        _at += 4;
        return value;
    }
    std::int32_t i32() noexcept { return static_cast<std::int32_t>(u32()); }

private:
    const std::uint8_t* _at;
};

}  // namespace tiktal::nZRAPAL000

// The record of the request messages received, in the order they arrived, for tests to read back.
// Every message with a whole header is recorded, refused ones included, once the directives for
// it are taken (so a request that a test sees in the record has had its directives); the record
// keeps the latest kRecordLimit of them.
#pragma once

#include "wire.h"

#include <cstddef>
#include <cstdint>
#include <deque>
#include <mutex>
#include <vector>

namespace devd {

inline constexpr std::size_t kRecordLimit = 65536;

struct RecordedPacket {
    std::uint32_t code = 0;
    std::uint32_t outputSize = 0;
    Bytes input;  // everything after the header
};

class Record {
public:
    void add(RecordedPacket packet);
    std::vector<RecordedPacket> all() const;
    void clear();

private:
    mutable std::mutex _lock;
    std::deque<RecordedPacket> _packets;
};

}  // namespace devd

#include "record.h"

namespace devd {

void Record::add(RecordedPacket packet) {
    std::lock_guard<std::mutex> guard(_lock);
    if (_packets.size() == kRecordLimit) _packets.pop_front();
    _packets.push_back(std::move(packet));
}

std::vector<RecordedPacket> Record::all() const {
    std::lock_guard<std::mutex> guard(_lock);
    return {_packets.begin(), _packets.end()};
}

void Record::clear() {
    std::lock_guard<std::mutex> guard(_lock);
    _packets.clear();
}

}  // namespace devd

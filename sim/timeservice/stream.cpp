#include "stream.h"

#include "protocol.h"

#include <algorithm>
#include <memory>

namespace timeservice {
namespace {

// The most one call of the content provider hands to the connection.
constexpr std::size_t kPiece = 64 * 1024;

// The text repeated: any piece of it, wherever it starts, is one contiguous run of a block that
// holds the text often enough to cover a piece from any position within one copy.
class RepeatedText {
public:
    RepeatedText(const std::string& text, long long times)
        : _period(text.size()), _size(static_cast<unsigned long long>(text.size()) * static_cast<unsigned long long>(times)) {
        if (_period == 0) return;
        const std::size_t copies = (kPiece + _period - 1) / _period + 1;
        _block.reserve(copies * _period);
        for (std::size_t i = 0; i < copies; ++i) _block += text;
    }

    unsigned long long size() const { return _size; }

    // Hands the piece that starts at `offset` to the connection; false when it did not take it.
    bool send(unsigned long long offset, httplib::DataSink& sink, StreamCounters& counters) const {
        const std::size_t length = static_cast<std::size_t>(std::min<unsigned long long>(kPiece, _size - offset));
        // Counted before the client can have it, so that a client that has read the whole body
        // finds it counted; taken back when the connection did not take it.
        counters.bytes += static_cast<long long>(length);
        if (sink.write(_block.data() + offset % _period, length)) return true;
        counters.bytes -= static_cast<long long>(length);
        return false;
    }

private:
    std::size_t _period;
    unsigned long long _size;
    std::string _block;
};

}  // namespace

void streamBody(httplib::Response& res, const std::string& text, long long times, bool chunked,
                StreamCounters& counters) {
    const auto body = std::make_shared<const RepeatedText>(text, times);
    ++counters.running;
    // The response calls this when it is destroyed, whether the body went out whole or not.
    const auto finished = [&counters](bool) { --counters.running; };
    if (chunked) {
        res.set_chunked_content_provider(
            kMediaType,
            [body, &counters](std::size_t offset, httplib::DataSink& sink) {
                if (offset < body->size()) return body->send(offset, sink, counters);
                sink.done();
                return true;
            },
            finished);
    } else {
        res.set_content_provider(
            static_cast<std::size_t>(body->size()), kMediaType,
            [body, &counters](std::size_t offset, std::size_t, httplib::DataSink& sink) {
                return body->send(offset, sink, counters);
            },
            finished);
    }
}

}  // namespace timeservice

#include "daemon.h"

namespace devd {

void Lifetime::stop() {
    {
        std::lock_guard<std::mutex> guard(_lock);
        _stopping = true;
    }
    _changed.notify_all();
}

bool Lifetime::stopping() const {
    std::lock_guard<std::mutex> guard(_lock);
    return _stopping;
}

bool Lifetime::sleepFor(int milliseconds) {
    std::unique_lock<std::mutex> guard(_lock);
    return !_changed.wait_for(guard, std::chrono::milliseconds(milliseconds), [this] { return _stopping; });
}

}  // namespace devd

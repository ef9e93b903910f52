#include "api/globals.h"

#include "errors/zrerr.h"

namespace tiktal {

GuardedMutex::GuardedMutex(nZRAPALS100::tStatus& initStatus, int line) noexcept {
    if (initStatus.isError()) return;
    const std::int32_t status = _mutex.init();
    if (status == 0)
        _initialized = true;
    else
        initStatus.merge(status, "tiktal_impl", ZRERR_FILE, static_cast<std::uint32_t>(line));
}

GuardedMutex::~GuardedMutex() {
    if (_initialized) _mutex.destroy();
}

SessionDB::~SessionDB() { _sessions.clear(); }

ViSession SessionDB::addSession(std::shared_ptr<Session> session) {
    platform::LockGuard hold(_lock.get());
    // After 2^32 - 1 registrations the counter comes round again: skip handles still open.
    while (_sessions.count(_nextId) != 0) _nextId = _nextId + 1 == 0 ? 1 : _nextId + 1;
    const ViSession id = _nextId;
    session->id = id;
    _sessions.emplace(id, std::move(session));
    _nextId = id + 1 == 0 ? 1 : id + 1;
    return id;
}

std::shared_ptr<Session> SessionDB::getSession(ViSession id) {
    {
        platform::LockGuard hold(_lock.get());
        const auto found = _sessions.find(id);
        if (found != _sessions.end()) return found->second;
    }
    throw ZRERR_RAISE(tiktalerr_invalidObject).debug("msg", "SessionDB::getSession: id not found").debug("id", id);
}

void SessionDB::removeSession(ViSession id) {
    platform::LockGuard hold(_lock.get());
    _sessions.erase(id);
}

namespace {
Globals gGlobals;  // built at load, before any export can run
}

Globals& globals() noexcept { return gGlobals; }

void checkGlobalInit() {
    const std::int32_t code = globals().initStatus.code;
    if (code != 0)
        throw ZRERR_RAISE(tiktalerr_internalSoftware).debug("msg", "global initialization failed").debug("code", code);
}

}  // namespace tiktal

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

namespace {

// The handle after `id`: the counter runs modulo 2^32 and leaves out 0.
ViSession following(ViSession id) noexcept { return id + 1 == 0 ? 1 : id + 1; }

}  // namespace

SessionDB::SessionDB(nZRAPALS100::tStatus& initStatus) noexcept : _counterLock(initStatus, __LINE__) {}

ViSession SessionDB::addSession(std::shared_ptr<Session> session) {
    platform::LockGuard counting(_counterLock.get());
    // After 2^32 - 1 registrations the counter comes round again: skip handles still open.
    for (;; _nextId = following(_nextId)) {
        Shard& shard = shardOf(_nextId);
        const ShardGuard hold(shard.lock);
        if (shard.sessions.count(_nextId) != 0) continue;
        const ViSession id = _nextId;
        session->id = id;
        shard.sessions.emplace(id, Entry{std::move(session)});
        _nextId = following(id);
        return id;
    }
}

SessionDB::Held::Held(SessionDB& registry, ViSession id) : _shard(registry.shardOf(id)), _entry(nullptr) {
    {
        const ShardGuard hold(_shard.lock);
        const auto found = _shard.sessions.find(id);
        if (found != _shard.sessions.end() && !found->second.closed) {
            _entry = &found->second;
            ++_entry->calls;
            return;
        }
    }
    throw ZRERR_RAISE(tiktalerr_invalidObject).debug("msg", "SessionDB::getSession: id not found").debug("id", id);
}

SessionDB::Held::~Held() {
    std::map<ViSession, Entry>::node_type ended;
    {
        const ShardGuard hold(_shard.lock);
        if (--_entry->calls == 0 && _entry->closed) ended = _shard.sessions.extract(_entry->session->id);
    }
    // `ended` destroys the session here, outside the lock.
}

void SessionDB::removeSession(ViSession id) {
    // Every shard, in order, so that the destructor of a session that no call holds runs before
    // any other lookup, addition or removal.
    for (Shard& shard : _shards) shard.lock.lock();
    auto& sessions = shardOf(id).sessions;
    const auto found = sessions.find(id);
    if (found != sessions.end()) {
        if (found->second.calls == 0)
            sessions.erase(found);
        else
            found->second.closed = true;
    }
    for (auto shard = _shards.rbegin(); shard != _shards.rend(); ++shard) shard->lock.unlock();
}

Globals gGlobals;

void failGlobalInit(std::int32_t code) {
    throw ZRERR_RAISE(tiktalerr_internalSoftware).debug("msg", "global initialization failed").debug("code", code);
}

}  // namespace tiktal

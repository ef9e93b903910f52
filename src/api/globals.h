// Process-wide state, built when the library is loaded and torn down when it is unloaded.
#pragma once

#include <array>
#include <cstddef>
#include <map>
#include <memory>
#include <mutex>

#include "errors/tstatus.h"
#include "platform/platform.h"
#include "sessions/session.h"
#include "support/spin_lock.h"

namespace tiktal {

// A lock whose initialization is skipped after an earlier failure and recorded on its own.
class GuardedMutex {
public:
    GuardedMutex(nZRAPALS100::tStatus& initStatus, int line) noexcept;
    ~GuardedMutex();
    platform::Mutex& get() noexcept { return _mutex; }

private:
    platform::Mutex _mutex;
    bool _initialized = false;
};

// Memory that one thread writes often gets this many bytes to itself: the processor fetches cache
// lines in pairs, so data of two threads in one pair slows both down.
inline constexpr std::size_t kCacheLinePair = 128;

// The registry of open sessions, split by handle into shards that each have their own lock and
// map, so that calls on different sessions look their handles up without meeting on one lock.
// Issuing a handle takes the counter's lock, then the lock of the new handle's shard. Closing
// takes the lock of every shard: a session that no call holds is destroyed while all of them are
// held, so no lookup proceeds until its destructor has returned. A session closed during calls
// is gone for lookups at once and destroyed by the last of those calls as it ends.
class SessionDB {
    struct Entry;
    struct Shard;

public:
    explicit SessionDB(nZRAPALS100::tStatus& initStatus) noexcept;

    ViSession addSession(std::shared_ptr<Session> session);
    void removeSession(ViSession id);

    // The session of a handle, held for one call: found, or tiktalerr_invalidObject. Each call
    // counts itself in the registry under its shard's lock, which takes as many atomic operations
    // as sharing the session's ownership would, and makes the lookup cost none of its own.
    class Held {
    public:
        Held(SessionDB& registry, ViSession id);
        ~Held();
        Held(const Held&) = delete;
        Held& operator=(const Held&) = delete;
        Session& operator*() const noexcept { return *_entry->session; }

    private:
        Shard& _shard;
        Entry* _entry;  // stays in its map while it counts this call
    };

private:
    static constexpr std::size_t kShards = 16;

    // Each call writes its session's count: the counts of two sessions never share memory that
    // the processor fetches at once.
    struct alignas(kCacheLinePair) Entry {
        std::shared_ptr<Session> session;
        std::uint32_t calls = 0;  // calls holding it now
        bool closed = false;      // closed while held: gone for lookups, ended by the last call
    };

    // Lookups in different shards write no memory in common. A lookup holds its shard's lock for
    // a few instructions only, so a spin lock serves it with half the atomic operations of a mutex.
    struct alignas(kCacheLinePair) Shard {
        support::SpinLock lock;
        std::map<ViSession, Entry> sessions;
    };
    using ShardGuard = std::lock_guard<support::SpinLock>;

    Shard& shardOf(ViSession id) noexcept { return _shards[id % kShards]; }

    GuardedMutex _counterLock;
    ViSession _nextId = 0x7FFFFFFF;  // guarded by _counterLock
    std::array<Shard, kShards> _shards;
};

struct Globals {
    nZRAPALS100::tStatus initStatus;
    SessionDB sessionDB{initStatus};
    GuardedMutex deviceListLock{initStatus, __LINE__};
};

extern Globals gGlobals;  // built at load, before any export can run
inline Globals& globals() noexcept { return gGlobals; }

[[noreturn]] void failGlobalInit(std::int32_t code);
// Fails with tiktalerr_internalSoftware when the process-wide initialization failed.
inline void checkGlobalInit() {
    if (const std::int32_t code = gGlobals.initStatus.code; code != 0) failGlobalInit(code);
}

}  // namespace tiktal

// Process-wide state, built when the library is loaded and torn down when it is unloaded.
#pragma once

#include <map>
#include <memory>

#include "errors/tstatus.h"
#include "platform/platform.h"
#include "sessions/session.h"

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

// The registry of open sessions. Its lock is held only to look up, add or remove a handle.
class SessionDB {
public:
    explicit SessionDB(nZRAPALS100::tStatus& initStatus) noexcept : _lock(initStatus, __LINE__) {}
    ~SessionDB();

    ViSession addSession(std::shared_ptr<Session> session);
    std::shared_ptr<Session> getSession(ViSession id);
    void removeSession(ViSession id);

private:
    GuardedMutex _lock;
    std::map<ViSession, std::shared_ptr<Session>> _sessions;
    ViSession _nextId = 0x7FFFFFFF;
};

struct Globals {
    nZRAPALS100::tStatus initStatus;
    SessionDB sessionDB{initStatus};
    GuardedMutex deviceListLock{initStatus, __LINE__};
};

Globals& globals() noexcept;

// Fails with tiktalerr_internalSoftware when the process-wide initialization failed.
void checkGlobalInit();

}  // namespace tiktal

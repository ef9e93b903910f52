// Opening and closing sessions.
#include "api/frame.h"
#include "factory/session_factory.h"

namespace {

using tiktal::Session;

// A reset that the session does not offer is reported as such to the opener.
void resetForOpen(Session& session) {
    try {
        session.reset();
    } catch (const zrerr::ExceptionBase& e) {
        if (e.code() != tiktalerr_featureNotSupported) throw;
        throw ZRERR_RAISE(tiktalerr_resetNotSupported).debug("func", "tiktal_init");
    }
}

// Shared ownership of `session` whose reference counts have their cache lines to themselves:
// every call changes them, and beside the counts of another session they would make calls on
// different sessions from different threads slow each other down.
std::shared_ptr<Session> shareAlone(std::unique_ptr<Session> session) {
    struct alignas(tiktal::kCacheLinePair) Owner {
        std::unique_ptr<Session> session;
    };
    std::shared_ptr<Owner> owner = std::make_shared<Owner>(Owner{std::move(session)});
    Session* const shared = owner->session.get();
    return std::shared_ptr<Session>(std::move(owner), shared);
}

}  // namespace

extern "C" {

ViStatus _VI_FUNC tiktal_init(ViRsrc resourceName, ViBoolean, ViBoolean reset, ViSession* vi) {
    return tiktal::guard([&] {
        if (!vi) throw ZRERR_RAISE(tiktalerr_invParameter).debug("func", "tiktal_init");
        *vi = 0;
        tiktal::checkGlobalInit();
        if (!resourceName) throw ZRERR_RAISE(tiktalerr_invParameter).debug("func", "tiktal_init");
        std::shared_ptr<Session> session = shareAlone(tiktal::createSession(resourceName));
        if (reset) resetForOpen(*session);
        *vi = tiktal::globals().sessionDB.addSession(std::move(session));
        return VI_SUCCESS;
    });
}

ViStatus _VI_FUNC tiktal_initAdvanced(ViRsrc resourceName, ViInt32, ViInt32, ViBoolean reset, ViSession* vi) {
    return tiktal_init(resourceName, VI_FALSE, reset, vi);
}

ViStatus _VI_FUNC tiktal_close(ViSession vi) {
    return tiktal::guard([&] {
        tiktal::checkGlobalInit();
        tiktal::globals().sessionDB.removeSession(vi);
        return VI_SUCCESS;
    });
}

}  // extern "C"

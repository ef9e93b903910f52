// createSession: the resource name decides the kind of session.
#include "sessions/session.h"

#include "client/horlo_uri.h"
#include "errors/zrerr.h"
#include "support/casefold.h"
#include "tsession/horlo_session.h"

namespace tiktal {

std::unique_ptr<Session> createSession(const char* resourceName) {
    if (support::equalsIgnoringCase(resourceName, kTestResourceName))
        return std::make_unique<SessionDebugPrintOnly>();
    if (horloUtils::isHorloUri(resourceName)) return createHorloSession(resourceName);
    throw ZRERR_RAISE(tiktalerr_deviceNotFound)
        .debug("msg", "createSession unknown resource name")
        .debug("resourceName", resourceName);
}

}  // namespace tiktal

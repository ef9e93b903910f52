// The session factory: the resource name that a caller opens decides the kind of session.
#pragma once

#include <memory>

#include "SessionClass.h"

namespace tiktal {

// A new session for `resourceName`, tried in this order: the test name (call tracing), a
// time-service URI, the alias of a local device, its PCI address as a PXI resource name. A name
// that none of them knows, or a local device that is not present or of another kind, fails with
// tiktalerr_deviceNotFound; failures of building the device list keep their own status.
std::unique_ptr<Session> createSession(const char* resourceName);

}  // namespace tiktal

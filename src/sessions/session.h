// The sessions: the interface behind every handle, the call-tracing session, and the factory
// that turns a resource name into a session.
#pragma once

#include <memory>

#include "SessionClass.h"
#include "SessionDebugPrintOnly.h"

namespace tiktal {

// The test name that opens a call-tracing session.
inline constexpr const char kTestResourceName[] = "SyncTestInternal___";

// A new session for `resourceName`; fails with tiktalerr_deviceNotFound for an unknown name.
std::unique_ptr<Session> createSession(const char* resourceName);

}  // namespace tiktal

// The sessions: the interface behind every handle and the call-tracing session.
#pragma once

#include "SessionClass.h"
#include "SessionDebugPrintOnly.h"

namespace tiktal {

// The test name that opens a call-tracing session.
inline constexpr const char kTestResourceName[] = "SyncTestInternal___";

}  // namespace tiktal

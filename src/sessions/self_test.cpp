// The self test that every session shares.
#include "sessions/session.h"

#include <cstring>

#include "errors/zrerr.h"

namespace tiktal {

void Session::selfTest(ViInt16* selfTestResult, ViChar* selfTestMessage) {
    if (!selfTestResult || !selfTestMessage) throw ZRERR_RAISE(tiktalerr_invParameter);
    *selfTestResult = 0;
    std::strncpy(selfTestMessage, "Self test passed", 256);
}

}  // namespace tiktal

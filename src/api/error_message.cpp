// tiktal_error_message: the message of any status.
#include <cstdio>

#include "api/frame.h"
#include "errors/status_table.h"

extern "C" ViStatus _VI_FUNC tiktal_error_message(ViSession, ViStatus errorCode, ViChar errorMessage[]) {
    return tiktal::guard([&] {
        if (!errorMessage)
            throw ZRERR_RAISE(tiktalerr_invParameter)
                .debug("func", "tiktal_error_message")
                .debug("msg", "errorMessage buffer is null");
        if (const zrerr::StatusRow* row = zrerr::findStatus(errorCode)) {
            std::strncpy(errorMessage, row->message, TIKTAL_ERROR_MESSAGE_SIZE);
            return VI_SUCCESS;
        }
        std::snprintf(errorMessage, TIKTAL_ERROR_MESSAGE_SIZE, "Unknown status value 0x%08lX",
                      static_cast<unsigned long>(static_cast<ViUInt32>(errorCode)));
        return tiktalerr_warn_unknownStatus;
    });
}

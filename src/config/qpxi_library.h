// The PXI chassis query library (libzrqpxi.so), loaded at run time: it tells in which chassis and
// slot of a PXI system a PCI device sits.
#pragma once

#include "QPXILibrary.h"
#include "errors/call_record.h"
#include "errors/zrerr.h"
#include "timing/auto_lib.h"

namespace zrqpxi {

struct ChassisQuery {
    static constexpr const char* kComponent = "zrqpxi";
    static constexpr const char* kName = "The PXI chassis query library";
};

// A fresh record for one call of the library; CallStatus::call(function) makes the call.
using CallStatus = zrerr::CallRecord<zrqpxi_Status, ChassisQuery>;

// The library loaded by bare file name in the system's search order. Loading never raises: a
// missing library, or the first of its functions that is missing, is recorded in the caller's
// status and in the library's own, and leaves that function and every later one null.
class DynamicQPXILibrary final : public QPXIFunctionTable, private zrdynlib::AutoLib {
public:
    // Loads nothing when `status` already holds an error.
    explicit DynamicQPXILibrary(zrerr::ExceptionBase& status);
    ~DynamicQPXILibrary() override = default;

    // What loading recorded: 0 when all 17 functions are there.
    const zrerr::Exception& status() const noexcept { return _status; }

private:
    zrerr::Exception _status;
};

}  // namespace zrqpxi

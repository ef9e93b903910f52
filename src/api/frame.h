// The frame that every export runs in: failures become statuses at this boundary and nowhere
// else.
#pragma once

#include <cstring>
#include <new>
#include <string>

#include "api/globals.h"
#include "errors/call_record.h"
#include "errors/zrerr.h"

namespace tiktal {

// Runs `body` and turns whatever it raises into a status.
template <class Body>
ViStatus guard(Body&& body) noexcept {
    const zrerr::CallEntry entry;
    try {
        return body();
    } catch (const zrerr::ExceptionBase& e) {
        return zrerr::normalize(e.code());
    } catch (const std::bad_alloc&) {
        return tiktalerr_outOfMemory;
    } catch (...) {
        return tiktalerr_internalSoftware;
    }
}

// Runs one operation on the session of `vi`, holding the session alive for the call.
template <class Operation>
ViStatus forward(ViSession vi, Operation&& operation) noexcept {
    return guard([&] {
        checkGlobalInit();
        const SessionDB::Held session(globals().sessionDB, vi);
        operation(*session);
        return VI_SUCCESS;
    });
}

// A text output with the size query: bufferSize 0 and no buffer (or, when `emptyIsQuery`, an
// empty buffer) returns the size needed; otherwise the text and its NUL must fit.
template <class Operation>
ViStatus forwardText(ViSession vi, const char* func, ViInt32 bufferSize, ViChar* buffer, bool emptyIsQuery,
                     Operation&& operation) noexcept {
    return guard([&] {
        std::string text;
        const ViStatus status = forward(vi, [&](Session& session) { operation(session, text); });
        if (status != VI_SUCCESS) return status;
        const bool query = bufferSize == 0 && (buffer == nullptr || (emptyIsQuery && buffer[0] == '\0'));
        if (query) return static_cast<ViStatus>(text.size() + 1);
        if (buffer == nullptr || bufferSize < 0 || text.size() + 1 > static_cast<std::size_t>(bufferSize))
            throw ZRERR_RAISE(tiktalerr_invParameter).debug("func", func);
        std::memcpy(buffer, text.c_str(), text.size() + 1);
        std::memset(buffer + text.size(), 0, static_cast<std::size_t>(bufferSize) - text.size());
        return VI_SUCCESS;
    });
}

}  // namespace tiktal

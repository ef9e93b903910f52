// The JSON status record through which a library loaded at run time (routing service, PXI chassis
// query library) reports one call, and the check after the call. Each library declares its own
// record type, with the same fields: code, capacity, reallocate, json.
#pragma once

#include <cstdint>
#include <exception>
#include <type_traits>
#include <utility>

namespace zrerr {

// The exceptions in flight on this thread when the export call running on it began. A call that
// finds more in flight runs in a destructor while one of its own failures unwinds; an
// application's exceptions (a call from its destructor during its unwinding) are not counted.
inline thread_local int exceptionsAtEntry = 0;

// Marks the start of an export call on this thread, and its end. Mostly none is in flight at the
// start, and the count in place is 0 already (a call that is not nested finds 0, a nested one no
// less than its outer call's), so only a call made during unwinding writes it.
class CallEntry {
public:
    CallEntry() noexcept : _entered(std::uncaught_exceptions()) {
        if (_entered == 0) return;
        _outer = exceptionsAtEntry;
        exceptionsAtEntry = _entered;
    }
    ~CallEntry() {
        if (_entered != 0) exceptionsAtEntry = _outer;
    }
    CallEntry(const CallEntry&) = delete;
    CallEntry& operator=(const CallEntry&) = delete;

private:
    int _entered;
    int _outer = 0;
};

// Whether a failure of this call is unwinding now.
inline bool unwindingThisCall() noexcept { return std::uncaught_exceptions() > exceptionsAtEntry; }

// The parts that do not depend on the record's type.
namespace record {
// Room for `wanted` bytes of text, the text kept; 0 frees it; above 0x7FFFFFFF fails. 1 or 0.
std::int32_t reallocate(char*& json, std::uint32_t& capacity, std::uint32_t wanted) noexcept;
// Raises a negative `code` with the record's JSON details when they are a readable object, else
// with a site of its own in `component` saying that `library` gave none.
[[noreturn]] void raise(std::int32_t code, const char* json, std::uint32_t capacity, const char* component,
                        const char* library);
}  // namespace record

// A fresh record for one call: code 0 and no text; its reallocate function owns the text.
// `Library` names the reporter: `Library::kComponent` ("zrrocoapi") and `Library::kName` ("The routing
// service").
template <class Record, class Library>
class CallRecord {
public:
    CallRecord() noexcept : _record{0, 0, &CallRecord::reallocate, nullptr} {}
    ~CallRecord() { reallocate(&_record, 0); }
    CallRecord(const CallRecord&) = delete;
    CallRecord& operator=(const CallRecord&) = delete;

    Record* get() noexcept { return &_record; }

    // Calls `function` with a fresh record as its last argument, then raises what the record
    // holds, unless a failure of this export call is already propagating (a call made from a
    // destructor while it unwinds).
    template <class Function, class... Args>
    static auto call(Function&& function, Args&&... args) {
        CallRecord status;
        const auto checkUnlessUnwinding = [&status] {
            if (!unwindingThisCall()) status.check();
        };
        if constexpr (std::is_void_v<decltype(function(std::forward<Args>(args)..., status.get()))>) {
            function(std::forward<Args>(args)..., status.get());
            checkUnlessUnwinding();
        } else {
            auto result = function(std::forward<Args>(args)..., status.get());
            checkUnlessUnwinding();
            return result;
        }
    }

    // Raises a negative code with the library's JSON details; success and warnings pass.
    void check() const {
        if (_record.code < 0)
            record::raise(_record.code, _record.json, _record.capacity, Library::kComponent, Library::kName);
    }

    // The reallocate function the library calls.
    static std::int32_t reallocate(Record* status, std::uint32_t capacity) noexcept {
        return status ? record::reallocate(status->json, status->capacity, capacity) : 0;
    }

private:
    Record _record;
};

}  // namespace zrerr

// The status exception: a ViStatus code plus a JSON detail text that says where and why it was
// raised. Only the exported functions turn it into a return value.
#pragma once

#include <cstdint>
#include <exception>
#include <string>
#include <type_traits>

#include <tiktal/tiktal.h>

namespace zrerr {

class ExceptionBase;

// Enlarges the detail buffer to at least `size` bytes, or frees it when `size` is 0.
using GrowRoutine = bool (*)(ExceptionBase& self, std::uint32_t size);

class ExceptionBase {
public:
    explicit ExceptionBase(GrowRoutine grow = defaultGrow) noexcept;
    ExceptionBase(const ExceptionBase& other) noexcept;
    ExceptionBase& operator=(const ExceptionBase& other) noexcept;
    virtual ~ExceptionBase();
    // The detail text, or "" when none was written.
    virtual const char* what() const noexcept;

    std::int32_t code() const noexcept { return _code; }

    // Takes `code` if this holds 0, or holds a warning and `code` is an error. On a change the
    // detail text restarts as "{}" and later members are written; otherwise they are dropped.
    bool setCode(std::int32_t code) noexcept;
    // The same rule for a whole status: a taken code brings its detail text along.
    void merge(const ExceptionBase& other) noexcept;

    // Members in the order written: of the top-level object, or when `nested` of the site's
    // debug object ("tiktal_debug" unless set), which the first nested member opens as the last
    // top-level member.
    void addText(const char* key, const char* value, bool nested = false) noexcept;
    void addInteger(const char* key, std::int64_t value, bool nested = false) noexcept;
    void addUnsigned(const char* key, std::uint64_t value, bool nested = false) noexcept;
    // A member whose value is the detail text of another status (nothing when it has none).
    void addDetail(const char* key, const ExceptionBase& other, bool nested = false) noexcept;
    // A member whose value is `jsonText`, a complete JSON value the caller built (nothing when
    // it is null).
    void addJson(const char* key, const char* jsonText, bool nested = false) noexcept;
    // Replaces the detail text with `jsonObject`, a complete JSON object the caller has checked:
    // the details of a component that reports in this shape. False when there is no room for it.
    bool adoptDetailText(const char* jsonObject) noexcept;

    void setDebugTag(const char* tag) noexcept { _debugTag = tag; }

    static bool defaultGrow(ExceptionBase& self, std::uint32_t size) noexcept;

protected:
    std::int32_t _code = 0;
    std::uint32_t _capacity = 0;
    GrowRoutine _grow;
    char* _text = nullptr;

private:
    friend struct DetailWriter;
    bool _accepting = false;  // the last setCode took its code
    bool _failed = false;     // a write could not grow the buffer: no further members
    bool _debugOpen = false;  // the debug object is the last member and still takes members
    const char* _debugTag = "tiktal_debug";
    void copyFrom(const ExceptionBase& other) noexcept;
};

// The type that is thrown; a handler for either base sees the same object.
class Exception : public virtual ExceptionBase, public virtual std::exception {
public:
    Exception() noexcept = default;
    explicit Exception(GrowRoutine grow) noexcept : ExceptionBase(grow) {}
    Exception(const Exception& other) noexcept : ExceptionBase(other), std::exception() {}
    Exception& operator=(const Exception& other) noexcept {
        ExceptionBase::operator=(other);
        return *this;
    }
    const char* what() const noexcept override { return ExceptionBase::what(); }

    // Site members, written into "tiktal_debug".
    Exception& debug(const char* key, const char* value) noexcept {
        addText(key, value, true);
        return *this;
    }
    Exception& debug(const char* key, const std::string& value) noexcept { return debug(key, value.c_str()); }
    // The status this one replaces, kept as a nested detail.
    Exception& cause(const ExceptionBase& other) noexcept {
        addDetail("nested_error", other, true);
        return *this;
    }
    template <class T, class = std::enable_if_t<std::is_integral_v<T>>>
    Exception& debug(const char* key, T value) noexcept {
        if constexpr (std::is_signed_v<T>)
            addInteger(key, value, true);
        else
            addUnsigned(key, value, true);
        return *this;
    }
};

// The "message" of a null output parameter, with "value": "NULL".
inline constexpr char kMissingParameter[] = "Encountered missing parameter needed for task completion.";

// Builds the exception of a raise site: the code and the four standard members; site members
// go into the object named `debugTag`.
Exception raise(std::int32_t code, const char* constant, const char* file, int line,
                const char* debugTag = "tiktal_debug") noexcept;

// The library's code for a code of a component below it (routing library, platform layer,
// time-service client); other codes pass unchanged.
std::int32_t normalize(std::int32_t code) noexcept;

}  // namespace zrerr

// Source path of the raising file, relative to the source or build tree.
#define ZRERR_FILE __FILE__
// `throw ZRERR_RAISE(tiktalerr_invParameter).debug("func", "tiktal_init");`
#define ZRERR_RAISE(constant) ::zrerr::raise((constant), #constant, ZRERR_FILE, __LINE__)

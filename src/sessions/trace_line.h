// Trace lines on the debug output: "[component|file|line] message", one whole line per write.
#pragma once

#include <exception>

// One trace source line. The component and file are right-aligned in 10 and 32 characters
// (keeping their last characters), the line number shows its last four digits.
class zrsdbg_VarLine {
public:
    zrsdbg_VarLine(const char* file, int line, const char* prefix = "", const char* component = "tiktal_impl") noexcept
        : _file(file), _line(line), _prefix(prefix), _component(component) {}
    virtual ~zrsdbg_VarLine() = default;

    // Formats the message and writes the whole line.
    virtual void printf(const char* format, ...) noexcept __attribute__((format(printf, 2, 3)));

    const char* prefix() const noexcept { return _prefix; }
    const char* suffix() const noexcept { return _suffix; }

private:
    const char* _file;
    int _line;
    const char* _terminator = "\n";
    const char* _prefix;
    const char* _suffix = "";
    const char* _component;
};

// Writes "{ name" when made and "} name" when destroyed, or "} (uncaught_exception) name"
// when an exception is leaving the scope.
class zrsdbg_ScopeLine {
public:
    zrsdbg_ScopeLine(const char* file, int line, const char* name) noexcept;
    ~zrsdbg_ScopeLine();
    zrsdbg_ScopeLine(const zrsdbg_ScopeLine&) = delete;
    zrsdbg_ScopeLine& operator=(const zrsdbg_ScopeLine&) = delete;

private:
    const char* _file;
    int _line;
    const char* _name;
    int _exceptions = std::uncaught_exceptions();
};

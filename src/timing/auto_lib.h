// A shared library loaded for the life of its owner, and its table of functions.
#pragma once

#include <cstddef>
#include <string>

namespace zrerr {
class ExceptionBase;
}

namespace zrdynlib {

// Owns one loaded library; unloads it when destroyed.
class AutoLib {
protected:
    AutoLib() = default;
    ~AutoLib();
    AutoLib(const AutoLib&) = delete;
    AutoLib& operator=(const AutoLib&) = delete;

    // Loads the library named `fileName` by the system's search order; fails with -52005 and the
    // loader's text.
    void load(const std::string& fileName);
    // Resolves every name into its slot; all are tried, then the first failure is raised with
    // -52005 naming its symbol.
    void resolve(const char* const* names, void** slots, std::size_t count);

    // The same, recording failures in `status` instead of raising them. `load` is true when the
    // library is loaded; `resolveInOrder` stops at the first name that is missing (it and the
    // later slots stay null) and is true when every name was found.
    bool load(const std::string& fileName, zrerr::ExceptionBase& status);
    bool resolveInOrder(const char* const* names, void** slots, std::size_t count,
                        zrerr::ExceptionBase& status);

private:
    void* _module = nullptr;
};

// A loaded library together with its function table `Table`, which names its functions
// (`Table::name(i)`, `Table::kCount`) and takes them (`function(i)`).
template <class Table>
class AutoLibWithInterface : private AutoLib {
public:
    explicit AutoLibWithInterface(const std::string& fileName) {
        load(fileName);
        void* slots[Table::kCount] = {};
        const char* names[Table::kCount];
        for (std::size_t i = 0; i < Table::kCount; ++i) names[i] = Table::name(i);
        resolve(names, slots, Table::kCount);
        for (std::size_t i = 0; i < Table::kCount; ++i) _table.function(i) = slots[i];
    }

    Table& get() noexcept { return _table; }

private:
    Table _table;
};

}  // namespace zrdynlib

// The aliases that configured devices use, compared as aliases are: ignoring case (Unicode simple
// case folding), so "pxi1slot2" is in use when "PXI1Slot2" is.
#pragma once

#include <cstddef>
#include <initializer_list>
#include <map>
#include <string>
#include <string_view>

namespace zrjsonconfig {

// A multiset: an alias that two devices use stays in use until both are removed.
class AliasesInUse {
public:
    AliasesInUse() = default;
    AliasesInUse(std::initializer_list<std::string_view> aliases);

    void add(std::string_view alias);
    void remove(std::string_view alias);
    bool contains(std::string_view alias) const;
    // The number of devices counted, including those that share an alias.
    std::size_t size() const noexcept { return _size; }

private:
    std::map<std::string, std::size_t> _counts;  // by case-fold key
    std::size_t _size = 0;
};

}  // namespace zrjsonconfig

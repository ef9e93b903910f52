// The aliases that configured devices use, compared as aliases are: ignoring case (Unicode simple
// case folding), so "pxi1slot2" is in use when "PXI1Slot2" is.
#pragma once

#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <map>
#include <set>
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

    // The first n of 1, 2, 3, ... for which `prefix` followed by n in decimal is not in use. The
    // set remembers where the search of each prefix got to and which numbers were removed below
    // it, so that numbering many new devices one after the other takes time in proportion to
    // their count. (That memory changes in a search: search one set from one thread at a time.)
    std::uint64_t firstFreeNumber(std::string_view prefix) const;

private:
    // Of one prefix: every number below `next` is in use except those in `freed` (which may hold
    // numbers that are in use again).
    struct Numbering {
        std::uint64_t next = 1;
        std::set<std::uint64_t> freed;
    };
    void noteFreed(std::string_view alias);

    std::map<std::string, std::size_t> _counts;  // by case-fold key
    std::size_t _size = 0;
    mutable std::map<std::string, Numbering> _numbering;  // by the case-fold key of the prefix
};

}  // namespace zrjsonconfig

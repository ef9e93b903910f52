#include "config/aliases_in_use.h"

#include "support/casefold.h"

namespace zrjsonconfig {

AliasesInUse::AliasesInUse(std::initializer_list<std::string_view> aliases) {
    for (std::string_view alias : aliases) add(alias);
}

void AliasesInUse::add(std::string_view alias) {
    ++_counts[support::caseFoldKey(alias)];
    ++_size;
}

void AliasesInUse::remove(std::string_view alias) {
    const auto found = _counts.find(support::caseFoldKey(alias));
    if (found == _counts.end()) return;
    if (--found->second == 0) _counts.erase(found);
    --_size;
}

bool AliasesInUse::contains(std::string_view alias) const { return _counts.count(support::caseFoldKey(alias)) != 0; }

}  // namespace zrjsonconfig

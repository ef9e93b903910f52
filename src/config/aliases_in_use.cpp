#include "config/aliases_in_use.h"

#include "support/casefold.h"

namespace zrjsonconfig {
namespace {

bool isDigit(char c) { return c >= '0' && c <= '9'; }

// Where the trailing decimal digits of `text` begin (its size when there are none).
std::size_t trailingDigits(std::string_view text) {
    std::size_t at = text.size();
    while (at > 0 && isDigit(text[at - 1])) --at;
    return at;
}

}  // namespace

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
    --_size;
    if (--found->second > 0) return;
    _counts.erase(found);
    noteFreed(alias);
}

bool AliasesInUse::contains(std::string_view alias) const { return _counts.count(support::caseFoldKey(alias)) != 0; }

// A numbered alias no longer in use: its number is free again for its prefix. Digits fold only
// to themselves, so the prefix of a numbered alias is what comes before its trailing digits,
// written as the search writes numbers (no leading zero).
void AliasesInUse::noteFreed(std::string_view alias) {
    if (_numbering.empty()) return;
    const std::size_t first = trailingDigits(alias);
    if (first == alias.size() || alias[first] == '0' || alias.size() - first > 19) return;
    const auto numbering = _numbering.find(support::caseFoldKey(alias.substr(0, first)));
    if (numbering == _numbering.end()) return;
    std::uint64_t number = 0;
    for (char digit : alias.substr(first)) number = number * 10 + static_cast<std::uint64_t>(digit - '0');
    if (number < numbering->second.next) numbering->second.freed.insert(number);
}

std::uint64_t AliasesInUse::firstFreeNumber(std::string_view prefix) const {
    const auto inUse = [&](std::uint64_t number) { return contains(std::string(prefix) + std::to_string(number)); };
    // A prefix that ends in a digit does not split off its numbers: searched from 1 each time.
    if (!prefix.empty() && isDigit(prefix.back())) {
        std::uint64_t number = 1;
        while (inUse(number)) ++number;
        return number;
    }
    Numbering& numbering = _numbering[support::caseFoldKey(prefix)];
    for (auto freed = numbering.freed.begin(); freed != numbering.freed.end(); freed = numbering.freed.erase(freed))
        if (!inUse(*freed)) return *freed;
    while (inUse(numbering.next)) ++numbering.next;
    return numbering.next;
}

}  // namespace zrjsonconfig

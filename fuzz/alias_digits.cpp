// Alias texts: counting trailing digits up, and the first free alias from a candidate. The input
// is "CANDIDATE\nALIAS\nALIAS...": a candidate and the aliases in use.
//
// Counting up keeps everything before the trailing digits and replaces them by their decimal
// successor (the same width unless every digit was 9, or "1" when there were none). The free
// alias is in use by no one (ignoring case), is the candidate itself whenever that is free, and
// otherwise the first free one counted up from the candidate's suffix "_1" (or from the candidate
// when its digits follow "_"). The set of aliases in use finds exactly the aliases that the
// pairwise comparison finds.
#include <algorithm>
#include <string>
#include <vector>

#include "config/alias_factory.h"
#include "property.h"
#include "support/casefold.h"

namespace {

using tiktalfuzz::require;

std::size_t firstTrailingDigit(const std::string& text) {
    std::size_t at = text.size();
    while (at > 0 && text[at - 1] >= '0' && text[at - 1] <= '9') --at;
    return at;
}

void checkCountUp(const std::string& text) {
    const std::string counted = zrjsonconfig::countUp(text);
    const std::size_t stem = firstTrailingDigit(text);
    require(counted.compare(0, stem, text, 0, stem) == 0, "the text before the digits stays");
    const std::string before = text.substr(stem), after = counted.substr(stem);
    require(firstTrailingDigit(counted) == stem, "the result ends in digits right after the stem");
    if (before.find_first_not_of('9') == std::string::npos)
        require(after == "1" + std::string(before.size(), '0'), "all nines (or none) carry into a new 1");
    else
        require(after.size() == before.size(), "the width stays without a carry past the first digit");
    // The successor digit by digit: a tail of nines becomes zeros and the digit before it grows by one.
    const std::size_t lastNotNine = before.find_last_not_of('9');
    if (lastNotNine != std::string::npos) {
        require(after.compare(0, lastNotNine, before, 0, lastNotNine) == 0, "digits before the carry stay");
        require(after[lastNotNine] == before[lastNotNine] + 1, "the carry adds one");
        require(after.find_first_not_of('0', lastNotNine + 1) == std::string::npos, "nines become zeros");
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    auto [candidate, rest] = tiktalfuzz::splitAt(tiktalfuzz::bytes(data, size), '\n');
    zrjsonconfig::AliasesInUse aliases;
    std::vector<std::string> listed;
    while (!rest.empty()) {
        const auto [alias, more] = tiktalfuzz::splitAt(rest, '\n');
        aliases.add(alias);
        listed.emplace_back(alias);
        rest = more;
    }
    const auto isInUse = [&listed](const std::string& alias) {
        return std::any_of(listed.begin(), listed.end(),
                           [&alias](const std::string& used) { return support::equalsIgnoringCase(alias, used); });
    };
    const std::string text(candidate);
    checkCountUp(text);
    require(aliases.contains(text) == isInUse(text), "the set finds what the comparison finds");

    const std::string alias = zrjsonconfig::firstFreeFrom(text, aliases);
    require(!isInUse(alias), "the alias is free");
    if (!isInUse(text)) {
        require(alias == text, "a free candidate is taken as it is");
    } else {
        const std::size_t stem = firstTrailingDigit(text);
        require(alias.compare(0, stem, text, 0, stem) == 0, "the candidate's text before its digits stays");
        require(firstTrailingDigit(alias) < alias.size(), "a taken candidate gives an alias ending in digits");
        // The first free one, counting up one by one from candidate + "_1" (or from the candidate
        // when its digits follow "_"), as aliases have always been chosen.
        const std::size_t digits = firstTrailingDigit(text);
        std::string first = digits > 0 && text[digits - 1] == '_' ? text : text + "_1";
        while (isInUse(first)) first = zrjsonconfig::countUp(first);
        require(alias == first, "the alias is the first free one counted up from the candidate");
    }
    return 0;
}

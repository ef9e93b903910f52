// The member helpers and the checked cJSON access on arbitrary text. The input is "NAME\nTEXT":
// the first line is the member name asked for, the rest the JSON text.
//
// Nothing may crash or hang, and only the failures that the export boundary turns into statuses
// may leave a helper: the status exception, boost's cast and numeric overflow failures, and
// std::bad_alloc. Any other exception ends the run. Beyond that:
// - a null member that the caller needs (OnNull::fail) fails;
// - counting an array's elements with the iterator gives its size;
// - a member read from the parsed object is the one read from the text;
// - on trees the comparison is checked on (see comparable): an object member's text, parsed
//   again, equals the member and prints the same; equals is reflexive and symmetric.
#include <boost/lexical_cast.hpp>
#include <boost/numeric/conversion/converter_policies.hpp>

#include <charconv>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <new>
#include <string>
#include <vector>

#include "errors/zrerr.h"
#include "json/helpers.h"
#include "json/zrjsonlh.h"
#include "property.h"

namespace {

using tiktalfuzz::require;

// Runs one call; the failures that become statuses end it quietly, any other escapes.
template <class Call>
void expectStatusOnFailure(Call call) {
    try {
        call();
    } catch (const zrerr::ExceptionBase&) {
    } catch (const boost::bad_lexical_cast&) {
    } catch (const boost::numeric::bad_numeric_cast&) {
    } catch (const std::bad_alloc&) {
    }
}

// Trees the comparison is checked on: numbers that cJSON prints exactly (it prints 15 significant
// digits when they come within a few units of the last place, so 0.30000000000000004 comes back
// as 0.3; beyond the range of a double it prints null), and no object with two names that are
// equal ignoring case (equals matches a member by name ignoring case, so such an object does not
// equal its own copy: a known fault, left out so that the rest stays checked).
bool comparable(const cJSON* item) {
    if (cJSON_IsNumber(item)) {
        char printed[32];
        std::snprintf(printed, sizeof printed, "%.15g", item->valuedouble);
        if (!std::isfinite(item->valuedouble) || std::strtod(printed, nullptr) != item->valuedouble) return false;
    }
    for (const cJSON* child = item ? item->child : nullptr; child; child = child->next) {
        if (cJSON_IsObject(item) && cJSON_GetObjectItem(item, child->string) != child) return false;
        if (!comparable(child)) return false;
    }
    return true;
}

// The member `name` of `text` as cJSON reads it, or null.
const cJSON* memberOf(const zrjsonlh::CppJson& tree, const char* name) { return cJSON_GetObjectItem(tree.get(), name); }

void checkHelpers(const std::string& text, const char* name) {
    zrjsonlh::CppJson tree;
    expectStatusOnFailure([&] { tree.parse(text.c_str()); });
    const bool isNull = cJSON_IsNull(memberOf(tree, name));
    expectStatusOnFailure([&] {
        std::string out = "untouched";
        if (!zrjson::getStringMember(text, name, out)) require(out == "untouched", "an absent member leaves the output alone");
    });
    expectStatusOnFailure([&] {
        std::string out;
        zrjson::getStringMember(text, name, out, zrjson::OnNull::fail);
        require(!isNull, "a null text that is needed fails");
    });
    expectStatusOnFailure([&] {
        std::int32_t out = 0;
        zrjson::getInt32NumberMember(text, name, out);
    });
    expectStatusOnFailure([&] {
        std::int32_t out = 0;
        zrjson::getInt32NumberMember(text, name, out, zrjson::OnNull::fail);
        require(!isNull, "a null number that is needed fails");
    });
    expectStatusOnFailure([&] {
        bool out = false;
        zrjson::getBoolMember(text, name, out);
    });
    expectStatusOnFailure([&] {
        std::vector<std::string> out;
        zrjson::getStringArrayMember(text, name, out);
    });
    expectStatusOnFailure([&] { zrjson::getInt32Member(text, name); });
    expectStatusOnFailure([&] {
        std::string fromText = "untouched", fromTree = "untouched";
        const bool found = zrjson::getStringMember(text, name, fromText);
        require(zrjson::getStringMember(tree.get(), name, fromTree) == found && fromTree == fromText,
                "the parsed object reads as its text");
    });
    expectStatusOnFailure([&] {
        std::string out;
        if (!zrjson::getObjectMemberText(text, name, out)) return;
        const cJSON* member = memberOf(tree, name);
        if (!comparable(member)) return;
        const zrjsonlh::CppJson again(out.c_str());
        require(zrjsonlh::equals(member, again.get()), "an object member's text parses to the same object");
        require(zrjsonlh::printUnformatted(again.get()) == out, "an object member's text prints the same again");
    });
}

void checkAccessors(const std::string& text, const char* name, std::uint32_t index) {
    expectStatusOnFailure([&] {
        const zrjsonlh::CppJson json(text.c_str());
        const cJSON* root = json.get();
        expectStatusOnFailure([&] { zrjsonlh::getString(zrjsonlh::getObjectItem(root, name)); });
        expectStatusOnFailure([&] { zrjsonlh::getInt32(zrjsonlh::getObjectItem(root, name)); });
        expectStatusOnFailure([&] { zrjsonlh::checkBool(zrjsonlh::getArrayItem(root, index)); });
        expectStatusOnFailure([&] { zrjsonlh::getInt32(zrjsonlh::getArrayItem(root, index)); });
        expectStatusOnFailure([&] {
            const auto size = zrjsonlh::ArrayIterator::distance(zrjsonlh::ArrayIterator::begin(root),
                                                                zrjsonlh::ArrayIterator::end());
            require(size == cJSON_GetArraySize(root), "the iterator steps over every element");
        });
        expectStatusOnFailure([&] {
            if (!comparable(root)) return;
            const zrjsonlh::CppJson again(zrjsonlh::print(root).c_str());
            require(zrjsonlh::equals(root, again.get()) && zrjsonlh::equals(again.get(), root),
                    "a tree equals its printed and parsed copy");
        });
        const cJSON* member = memberOf(json, name);
        if (comparable(root))
            require(zrjsonlh::equals(root, member) == zrjsonlh::equals(member, root), "equals is symmetric");
    });
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const auto [nameBytes, textBytes] = tiktalfuzz::splitAt(tiktalfuzz::bytes(data, size), '\n');
    const std::string name(nameBytes);
    const std::string text(textBytes);
    checkHelpers(text, name.c_str());
    // A name that is a number is also the index of an array element.
    std::uint32_t index = 0;
    std::from_chars(name.data(), name.data() + name.size(), index);
    checkAccessors(text, name.c_str(), index);
    return 0;
}

#include "factory/pxi_resource_name.h"

#include <utility>

namespace tiktal {
namespace {

constexpr std::uint32_t kMaxNumber = 65535;
constexpr std::uint32_t kMaxSignedNumber = 32767;

char upper(char c) { return c >= 'a' && c <= 'z' ? static_cast<char>(c - 'a' + 'A') : c; }

bool isDigit(char c) { return c >= '0' && c <= '9'; }

// `keyword` is written in upper case.
bool equalsKeyword(std::string_view text, std::string_view keyword) {
    if (text.size() != keyword.size()) return false;
    for (std::size_t i = 0; i < text.size(); ++i)
        if (upper(text[i]) != keyword[i]) return false;
    return true;
}

bool endsWithKeyword(std::string_view text, std::string_view keyword) {
    return text.size() >= keyword.size() && equalsKeyword(text.substr(text.size() - keyword.size()), keyword);
}

bool removeEndingKeyword(std::string_view& text, std::string_view keyword) {
    if (!endsWithKeyword(text, keyword)) return false;
    text.remove_suffix(keyword.size());
    return true;
}

// Reads the name from left to right. A step that fails fails its whole form, which starts again
// from its own copy of the scanner, so what a failed step consumed does not matter.
class Scanner {
public:
    explicit Scanner(std::string_view text) : _rest(text) {}

    bool atEnd() const { return _rest.empty(); }

    bool keyword(std::string_view word) {
        if (_rest.size() < word.size() || !equalsKeyword(_rest.substr(0, word.size()), word)) return false;
        _rest.remove_prefix(word.size());
        return true;
    }

    bool startsWithDigit() const { return !_rest.empty() && isDigit(_rest.front()); }

    // The whole run of digits, which must not exceed `max`.
    template <typename T>
    bool number(std::uint32_t max, T& value) {
        if (!startsWithDigit()) return false;
        std::uint32_t read = 0;
        for (; startsWithDigit(); _rest.remove_prefix(1))
            if (read <= max) read = read * 10 + static_cast<std::uint32_t>(_rest.front() - '0');
        if (read > max) return false;
        value = static_cast<T>(read);
        return true;
    }

    std::string_view rest() const { return _rest; }

private:
    std::string_view _rest;
};

// "PXI" or "PCI", the board number if any, and "::"; leaves the scanner after them.
bool prefix(Scanner& s, PxiResourceName& n) {
    if (!s.keyword("PXI") && !s.keyword("PCI")) return false;
    if (s.startsWithDigit() && !s.number(kMaxNumber, n.board)) return false;
    return s.keyword("::");
}

bool busDeviceForm(Scanner s, PxiResourceName& n) {
    n.form = PxiNameForm::busDevice;
    if (!s.number(kMaxNumber, n.bus) || !s.keyword("-") || !s.number(kMaxNumber, n.device)) return false;
    if (s.keyword(".") && !s.number(kMaxNumber, n.function)) return false;
    return s.atEnd();
}

bool deviceForm(Scanner s, PxiResourceName& n) {
    n.form = PxiNameForm::device;
    if (!s.number(kMaxNumber, n.device)) return false;
    if (s.keyword("::") && !s.number(kMaxNumber, n.function)) return false;
    n.bus = n.board;
    n.board = 0;
    return s.atEnd();
}

bool chassisSlotForm(Scanner s, PxiResourceName& n) {
    n.form = PxiNameForm::chassisSlot;
    if (!s.keyword("CHASSIS") || !s.number(kMaxSignedNumber, n.chassis) || !s.keyword("::SLOT") ||
        !s.number(kMaxSignedNumber, n.slot))
        return false;
    if (s.atEnd()) return true;
    if (s.keyword("::FUNC"))
        n.form = PxiNameForm::chassisSlotFunction;
    else if (s.keyword("::INDEX"))
        n.form = PxiNameForm::chassisSlotIndex;
    else
        return false;
    return s.number(kMaxNumber, n.functionOrIndex) && s.atEnd();
}

bool commaTextForm(Scanner s, PxiResourceName& n) {
    const std::string_view text = s.rest();
    if (text.empty() || text.size() > kMaxPxiCommaTextLength || text.find(',') == std::string_view::npos)
        return false;
    for (const char c : text)
        if (!isDigit(c) && c != ',' && c != '.') return false;
    n.form = PxiNameForm::commaText;
    n.text = std::string(text);
    return true;
}

bool backplaneForm(std::string_view chassis, PxiResourceName& n) {
    Scanner s(chassis);
    n.form = PxiNameForm::backplane;
    return s.number(kMaxSignedNumber, n.chassis) && s.atEnd();
}

// The forms that end in an optional "::INSTR", in the order in which they are tried.
bool instrumentForm(std::string_view rest, PxiResourceName& n) {
    removeEndingKeyword(rest, "::INSTR");
    for (const auto form : {busDeviceForm, deviceForm, chassisSlotForm, commaTextForm}) {
        PxiResourceName candidate = n;
        if (form(Scanner(rest), candidate)) {
            n = std::move(candidate);
            return true;
        }
    }
    return false;
}

bool matchesAForm(std::string_view rest, PxiResourceName& n) {
    if (endsWithKeyword(rest, "MEMACC")) {
        n.form = PxiNameForm::memoryAccess;
        return equalsKeyword(rest, "MEMACC");
    }
    if (removeEndingKeyword(rest, "::BACKPLANE")) return backplaneForm(rest, n);
    return instrumentForm(rest, n);
}

std::int32_t validate(const PxiResourceName& n) {
    if (n.board != 0) return pxiStatusBoardNotConfigured;
    if (n.bus > 255 || n.device > 31 || n.function > 7) return pxiStatusInvalidName;
    switch (n.form) {
    case PxiNameForm::backplane:
        return n.chassis >= 1 ? 0 : pxiStatusInvalidName;
    case PxiNameForm::chassisSlot:
    case PxiNameForm::chassisSlotIndex:
        return n.chassis >= 1 && n.slot >= 1 && n.slot <= 18 ? 0 : pxiStatusInvalidName;
    case PxiNameForm::chassisSlotFunction:
        return n.chassis >= 1 && n.slot >= 1 && n.slot <= 18 && n.functionOrIndex <= 7 ? 0 : pxiStatusInvalidName;
    default:
        return 0;
    }
}

}  // namespace

std::int32_t parsePxiResourceName(std::string_view name, PxiResourceName& out) {
    if (name.size() > kMaxPxiResourceNameLength) return pxiStatusInvalidName;
    Scanner s(name);
    PxiResourceName parsed;
    if (!prefix(s, parsed) || !matchesAForm(s.rest(), parsed)) return pxiStatusInvalidName;
    if (const std::int32_t status = validate(parsed); status != 0) return status;
    out = std::move(parsed);
    return 0;
}

}  // namespace tiktal

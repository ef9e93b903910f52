// Checked access to cJSON trees: every mismatch fails with a status that names its kind.
#pragma once

#include <cjson/cJSON.h>

#include <cstddef>
#include <cstdint>
#include <iterator>
#include <string>

namespace zrjsonlh {

// Statuses of a mismatch; the error-constant name tells the kinds with one status apart.
inline constexpr std::int32_t jsonErrorsInvalidJSON = -52005;
inline constexpr std::int32_t jsonErrorsNotAnObject = -52004;
inline constexpr std::int32_t jsonErrorsNotAnArray = -52004;
inline constexpr std::int32_t jsonErrorsTypeMismatch = -52004;
inline constexpr std::int32_t jsonErrorsObjectItemNotFound = -52006;
inline constexpr std::int32_t jsonErrorsArrayItemOutOfBounds = -52006;

// Parses the first JSON value of `text`; text after it is ignored. The caller owns the tree.
cJSON* parse(const char* text);

void checkObject(const cJSON* item);
void checkArray(const cJSON* item);
void checkString(const cJSON* item);
void checkBool(const cJSON* item);
void checkNumber(const cJSON* item);

// The first member named `name`, ignoring ASCII case.
cJSON* getObjectItem(const cJSON* object, const char* name);
cJSON* getArrayItem(const cJSON* array, std::uint32_t index);
std::string getString(const cJSON* item);
// Truncates toward zero; out of range fails with boost's numeric overflow.
std::int32_t getInt32(const cJSON* item);

std::string print(const cJSON* item);
std::string printUnformatted(const cJSON* item);

cJSON* createNumber(std::int32_t value);
cJSON* createNumber(std::uint32_t value);
// Takes ownership of `item`, also when it cannot be added.
void addItemToObject(cJSON* object, const char* name, cJSON* item);

// Deep comparison; object members are matched by name ignoring case, in any order.
bool equals(const cJSON* a, const cJSON* b);

// Owns one parsed tree.
class CppJson {
public:
    CppJson() = default;
    explicit CppJson(const char* text) { parse(text); }
    ~CppJson() { reset(); }
    CppJson(const CppJson&) = delete;
    CppJson& operator=(const CppJson&) = delete;

    void parse(const char* text);
    void reset(cJSON* root = nullptr) noexcept;
    cJSON* get() const noexcept { return _root; }

private:
    cJSON* _root = nullptr;
};

// Forward iteration over the elements of one array.
class ArrayIterator {
public:
    using iterator_category = std::forward_iterator_tag;
    using value_type = cJSON*;
    using difference_type = std::ptrdiff_t;
    using pointer = cJSON**;
    using reference = cJSON*;

    ArrayIterator() = default;  // the end
    static ArrayIterator begin(const cJSON* array);
    static ArrayIterator end() { return {}; }

    cJSON* operator*() const noexcept { return _current; }
    ArrayIterator& operator++();
    ArrayIterator operator++(int);
    bool operator==(const ArrayIterator& other) const noexcept { return _current == other._current; }
    bool operator!=(const ArrayIterator& other) const noexcept { return _current != other._current; }
    // Steps from `first` to `last`; fails when the end comes first.
    static std::ptrdiff_t distance(ArrayIterator first, ArrayIterator last);

private:
    explicit ArrayIterator(cJSON* current) : _current(current) {}
    cJSON* _current = nullptr;
};

}  // namespace zrjsonlh

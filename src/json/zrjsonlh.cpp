#include "json/zrjsonlh.h"

#include <boost/numeric/conversion/converter_policies.hpp>
#include <cmath>
#include <cstring>
#include <new>

#include "errors/zrerr.h"

namespace zrjsonlh {
namespace {

bool hasType(const cJSON* item, int type) { return item && (item->type & 0xFF) == type; }

std::string takePrinted(char* printed) {
    if (!printed) throw std::bad_alloc();
    std::string text(printed);
    cJSON_free(printed);
    return text;
}

}  // namespace

cJSON* parse(const char* text) {
    cJSON* root = text ? cJSON_ParseWithOpts(text, nullptr, false) : nullptr;
    if (!root) throw ZRERR_RAISE(jsonErrorsInvalidJSON);
    return root;
}

void checkObject(const cJSON* item) {
    if (!hasType(item, cJSON_Object)) throw ZRERR_RAISE(jsonErrorsNotAnObject);
}

void checkArray(const cJSON* item) {
    if (!hasType(item, cJSON_Array)) throw ZRERR_RAISE(jsonErrorsNotAnArray);
}

void checkString(const cJSON* item) {
    if (!hasType(item, cJSON_String)) throw ZRERR_RAISE(jsonErrorsTypeMismatch);
}

void checkBool(const cJSON* item) {
    if (!hasType(item, cJSON_True) && !hasType(item, cJSON_False)) throw ZRERR_RAISE(jsonErrorsTypeMismatch);
}

void checkNumber(const cJSON* item) {
    if (!hasType(item, cJSON_Number)) throw ZRERR_RAISE(jsonErrorsTypeMismatch);
}

cJSON* getObjectItem(const cJSON* object, const char* name) {
    checkObject(object);
    cJSON* item = cJSON_GetObjectItem(object, name);
    if (!item) throw ZRERR_RAISE(jsonErrorsObjectItemNotFound);
    return item;
}

cJSON* getArrayItem(const cJSON* array, std::uint32_t index) {
    checkArray(array);
    if (index > 2147483647u) throw boost::numeric::positive_overflow();
    cJSON* item = array->child;
    for (std::uint32_t step = 0; item && step < index; ++step) item = item->next;
    if (!item) throw ZRERR_RAISE(jsonErrorsArrayItemOutOfBounds);
    return item;
}

std::string getString(const cJSON* item) {
    checkString(item);
    return item->valuestring;
}

std::int32_t getInt32(const cJSON* item) {
    checkNumber(item);
    const double value = item->valuedouble;
    if (value <= -2147483649.0) throw boost::numeric::negative_overflow();
    if (value >= 2147483648.0) throw boost::numeric::positive_overflow();
    return static_cast<std::int32_t>(std::trunc(value));
}

std::string print(const cJSON* item) { return takePrinted(cJSON_Print(item)); }
std::string printUnformatted(const cJSON* item) { return takePrinted(cJSON_PrintUnformatted(item)); }

cJSON* createNumber(std::int32_t value) {
    cJSON* item = cJSON_CreateNumber(value);
    if (!item) throw std::bad_alloc();
    return item;
}

cJSON* createNumber(std::uint32_t value) {
    cJSON* item = cJSON_CreateNumber(static_cast<double>(value));  // never negative
    if (!item) throw std::bad_alloc();
    return item;
}

void addItemToObject(cJSON* object, const char* name, cJSON* item) {
    if (!cJSON_AddItemToObject(object, name, item)) {
        cJSON_Delete(item);
        throw std::bad_alloc();
    }
}

bool equals(const cJSON* a, const cJSON* b) {
    if (a == b) return true;
    if (!a || !b || (a->type & 0xFF) != (b->type & 0xFF)) return false;
    switch (a->type & 0xFF) {
    case cJSON_False:
    case cJSON_True:
    case cJSON_NULL:
        return true;
    case cJSON_Number:
        checkNumber(a);
        checkNumber(b);
        return a->valuedouble == b->valuedouble;
    case cJSON_String:
        return std::strcmp(a->valuestring, b->valuestring) == 0;
    case cJSON_Array: {
        if (cJSON_GetArraySize(a) != cJSON_GetArraySize(b)) return false;
        for (const cJSON *x = a->child, *y = b->child; x; x = x->next, y = y->next)
            if (!equals(x, y)) return false;
        return true;
    }
    case cJSON_Object: {
        if (cJSON_GetArraySize(a) != cJSON_GetArraySize(b)) return false;
        for (const cJSON* member = a->child; member; member = member->next)
            if (!equals(member, cJSON_GetObjectItem(b, member->string))) return false;
        return true;
    }
    default:
        return false;
    }
}

void CppJson::parse(const char* text) { reset(zrjsonlh::parse(text)); }

void CppJson::reset(cJSON* root) noexcept {
    if (_root) cJSON_Delete(_root);
    _root = root;
}

ArrayIterator ArrayIterator::begin(const cJSON* array) {
    checkArray(array);
    return ArrayIterator(array->child);
}

ArrayIterator& ArrayIterator::operator++() {
    if (!_current) throw ZRERR_RAISE(jsonErrorsArrayItemOutOfBounds);
    _current = _current->next;
    return *this;
}

ArrayIterator ArrayIterator::operator++(int) {
    ArrayIterator before = *this;
    ++*this;
    return before;
}

std::ptrdiff_t ArrayIterator::distance(ArrayIterator first, ArrayIterator last) {
    std::ptrdiff_t steps = 0;
    for (; first != last; ++first) ++steps;  // stepping past the end fails
    return steps;
}

}  // namespace zrjsonlh

// Entry points: containers of items and their iteration. The iterator value is the position of
// the next item; the end value is the number of items.
#include "frame.h"

using namespace qpxisim;

uint32_t zrqpxi_getItemContainer(uint32_t item, uint32_t itemType, zrqpxi_Status* st) {
    return run("getItemContainer", {item, itemType}, st, [=](State& s) { return s.openContainer(item, itemType); });
}

uint32_t zrqpxi_duplicateItemContainer(uint32_t container, zrqpxi_Status* st) {
    return run("duplicateItemContainer", {container}, st, [=](State& s) { return s.duplicateContainer(container); });
}

uint32_t zrqpxi_ItemIterator_begin(uint32_t container, zrqpxi_Status* st) {
    return run("ItemIterator_begin", {container}, st, [=](State& s) {
        s.containerSize(container);  // refuses unknown containers
        return uint32_t{0};
    });
}

#ifndef ZRQPXI_SIM_WITHOUT_NEXT_ITEM
uint32_t zrqpxi_ItemIterator_nextItem(uint32_t container, uint32_t* iterator, zrqpxi_Status* st) {
    return run("ItemIterator_nextItem", {container, iterator ? *iterator : 0xFFFFFFFFu}, st,
               [=](State& s) { return s.nextItem(container, iterator); });
}
#endif

uint32_t zrqpxi_ItemIterator_end(uint32_t container, zrqpxi_Status* st) {
    return run("ItemIterator_end", {container}, st, [=](State& s) { return s.containerSize(container); });
}

void zrqpxi_destroyItemContainer(uint32_t container) {
    run("destroyItemContainer", {container}, nullptr, [=](State& s) { s.destroyContainer(container); });
}

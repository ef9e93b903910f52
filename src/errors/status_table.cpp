#include "errors/status_table.h"

#include <tiktal/tiktal.h>

namespace zrerr {
namespace {

// Generated from src/tables/statuses.tsv; checks each code against the public header.
#include "statusTable.inc"

}  // namespace

const StatusRow* findStatus(std::int32_t code) noexcept {
    for (const StatusRow& row : kStatusTable)
        if (row.code == code) return &row;
    return nullptr;
}

}  // namespace zrerr

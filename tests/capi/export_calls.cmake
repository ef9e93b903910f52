# The exports of src/tables/exports.tsv as one macro call per row, TIKTAL_EXPORT_<kind>(name, "op"),
# written into ${CMAKE_CURRENT_BINARY_DIR}/export_calls.inc, so the tests cover every row and follow
# the table when it changes; the rows with a Windows ordinal also as
# TIKTAL_EXPORT_ORDINAL(ordinal, name, kind) into export_ordinals.inc.
set(exports_tsv ${PROJECT_SOURCE_DIR}/src/tables/exports.tsv)
set_property(DIRECTORY APPEND PROPERTY CMAKE_CONFIGURE_DEPENDS ${exports_tsv})
file(STRINGS ${exports_tsv} export_rows REGEX "^[^#]")
set(export_calls "")
set(export_ordinals "")
foreach(row IN LISTS export_rows)
  if(NOT row MATCHES "^([^\t]*)\t([A-Za-z0-9_]+)\t([a-z]+)\t([^\t]+)\t")
    message(FATAL_ERROR "exports.tsv: cannot read the row '${row}'")
  endif()
  set(ordinal ${CMAKE_MATCH_1})
  set(name ${CMAKE_MATCH_2})
  set(kind ${CMAKE_MATCH_3})
  string(APPEND export_calls "TIKTAL_EXPORT_${kind}(${name}, \"${CMAKE_MATCH_4}\")\n")
  if(ordinal MATCHES "^[0-9]+$")
    string(APPEND export_ordinals "TIKTAL_EXPORT_ORDINAL(${ordinal}, ${name}, ${kind})\n")
  endif()
endforeach()
file(CONFIGURE OUTPUT ${CMAKE_CURRENT_BINARY_DIR}/export_calls.inc CONTENT "${export_calls}" @ONLY)
file(CONFIGURE OUTPUT ${CMAKE_CURRENT_BINARY_DIR}/export_ordinals.inc CONTENT "${export_ordinals}" @ONLY)

# stand_in_library(<target> FOLDER <folder> OUTPUT_NAME <name> EXPORTS <version script>
#                  SOURCES <files...> LINK <libraries...> [DEFINITIONS <compile definitions...>]
#                  [UNLOADS])
# builds a stand-in for a library that the driver loads by bare file name: lib<name>.so in
# <folder>, exporting what the version script lets through. With UNLOADS, its last dlclose
# unloads it, for tests that put another copy in its place.
# On Windows it is <name>.dll, exporting the functions marked with STAND_IN_EXPORT (the version
# script is not used there), and it unloads at its last FreeLibrary, UNLOADS or not.
if(WIN32)
  set(STAND_IN_EXPORT "__declspec(dllexport)")
else()
  set(STAND_IN_EXPORT "__attribute__((visibility(\"default\")))")
endif()

function(stand_in_library target)
  cmake_parse_arguments(arg "UNLOADS" "FOLDER;OUTPUT_NAME;EXPORTS" "SOURCES;LINK;DEFINITIONS" ${ARGN})
  add_library(${target} SHARED ${arg_SOURCES})
  target_compile_definitions(${target} PRIVATE ${arg_DEFINITIONS})
  target_link_libraries(${target} PRIVATE ${arg_LINK})
  if(WIN32)
    target_link_options(${target} PRIVATE -Wl,--no-undefined)
    set_target_properties(${target} PROPERTIES OUTPUT_NAME ${arg_OUTPUT_NAME} PREFIX "" RUNTIME_OUTPUT_DIRECTORY ${arg_FOLDER}
                          ARCHIVE_OUTPUT_DIRECTORY ${CMAKE_CURRENT_BINARY_DIR}/${target})
    return()
  endif()
  target_link_options(${target} PRIVATE -Wl,--version-script=${arg_EXPORTS})
  if(NOT arg_UNLOADS)
    # Like the library it stands for, its state lasts as long as the process: a dlclose by its last
    # user does not unload it (and tests can still read that state).
    target_link_options(${target} PRIVATE -Wl,-z,nodelete)
  endif()
  if(NOT TIKTAL_SANITIZE)  # sanitizer runtimes are linked into the executables only
    target_link_options(${target} PRIVATE -Wl,--no-undefined)
  endif()
  set_target_properties(${target} PROPERTIES OUTPUT_NAME ${arg_OUTPUT_NAME} LIBRARY_OUTPUT_DIRECTORY ${arg_FOLDER}
                        LINK_DEPENDS ${arg_EXPORTS})
endfunction()

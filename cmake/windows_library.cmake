# tiktal.dll, included by the top level on Windows: exactly the exports of the module definition
# that gen.py writes for the architecture (the table's functions with their ordinals, the stubs as
# aliases of their shared bodies, cJSON's functions from the static cJSON linked in), and the
# import libraries beside the DLL: libtiktal.dll.a for mingw, tiktal.lib for MSVC.
target_sources(tiktal PRIVATE ${TIKTAL_GEN}/tiktal.def)
target_compile_definitions(tiktal PRIVATE TIKTAL_BUILDING_LIBRARY)
# On 32-bit Windows the module definition names the __stdcall functions by their decorated names
# (tiktal_init@16); --kill-at exports them undecorated. Without the stdcall fix-up a name whose
# decoration does not match its function fails the link instead of binding to a near miss.
target_link_options(tiktal PRIVATE -Wl,--kill-at -Wl,--disable-stdcall-fixup)
set_target_properties(tiktal PROPERTIES PREFIX "" LINK_DEPENDS ${TIKTAL_GEN}/tiktal.def)
# ld's own import library would name the functions undecorated, which no __stdcall caller
# references; dlltool's keeps the decorated names and imports them by the undecorated ones, for
# mingw and MSVC alike. It replaces ld's before anything links against the library.
set(TIKTAL_MSVC_IMPORT_LIBRARY ${CMAKE_BINARY_DIR}/tiktal.lib)
add_custom_command(TARGET tiktal POST_BUILD
  COMMAND ${CMAKE_DLLTOOL} --input-def ${TIKTAL_GEN}/tiktal.def --kill-at --dllname tiktal.dll
          --output-lib ${TIKTAL_MSVC_IMPORT_LIBRARY}
  COMMAND ${CMAKE_COMMAND} -E copy ${TIKTAL_MSVC_IMPORT_LIBRARY} $<TARGET_LINKER_FILE:tiktal>
  COMMENT "Writing the import libraries of tiktal.dll")
install(FILES ${TIKTAL_MSVC_IMPORT_LIBRARY} DESTINATION ${CMAKE_INSTALL_LIBDIR})

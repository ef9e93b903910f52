# Run by `cmake --install`: puts the Python package tiktal (its sources and the _attributes.py
# generated into the build tree) where the installed prefix's Python finds it, or, when no folder
# of the prefix is on that Python's path, into PREFIX/lib/pythonX.Y/site-packages with a word on
# how to reach it. Set by the caller: TIKTAL_PYTHON (the interpreter), TIKTAL_PYTHON_INSTALL_DIR
# (a folder chosen at configure time, relative to the prefix or absolute; empty: as above),
# TIKTAL_PYTHON_SOURCES (python/tiktal) and TIKTAL_PYTHON_GENERATED (its _attributes.py).

set(_prefix "${CMAKE_INSTALL_PREFIX}")
set(_hint "")
if(TIKTAL_PYTHON_INSTALL_DIR)
  if(IS_ABSOLUTE "${TIKTAL_PYTHON_INSTALL_DIR}")
    set(_dir "${TIKTAL_PYTHON_INSTALL_DIR}")
  else()
    set(_dir "${_prefix}/${TIKTAL_PYTHON_INSTALL_DIR}")
  endif()
else()
  # The first site or dist folder of the interpreter's path inside the prefix, else the folder a
  # prefix of that Python version would have.
  execute_process(
    COMMAND "${TIKTAL_PYTHON}" -c "
import os, sys
prefix = os.path.realpath(sys.argv[1])
for entry in sys.path:
    if entry.endswith(('site-packages', 'dist-packages')) and os.path.realpath(entry).startswith(prefix + os.sep):
        print('on-path', entry, sep='\\n', end='')
        break
else:
    print('off-path', os.path.join(sys.argv[1], 'lib', 'python%d.%d' % sys.version_info[:2], 'site-packages'), sep='\\n', end='')
" "${_prefix}"
    OUTPUT_VARIABLE _answer RESULT_VARIABLE _result)
  if(NOT _result EQUAL 0)
    message(FATAL_ERROR "tiktal: ${TIKTAL_PYTHON} did not say where its packages go (configure with -DTIKTAL_PYTHON=... or -DTIKTAL_PYTHON_INSTALL_DIR=...)")
  endif()
  string(REPLACE "\n" ";" _answer "${_answer}")
  list(GET _answer 0 _where)
  list(GET _answer 1 _dir)
  if(_where STREQUAL "off-path")
    set(_hint "${_dir}")
  endif()
endif()

file(GLOB _sources "${TIKTAL_PYTHON_SOURCES}/*.py")
file(INSTALL ${_sources} "${TIKTAL_PYTHON_SOURCES}/py.typed" "${TIKTAL_PYTHON_GENERATED}"
     DESTINATION "${_dir}/tiktal")
if(_hint)
  message(STATUS "The Python package tiktal is in ${_hint}, which ${TIKTAL_PYTHON} does not search: "
                 "export PYTHONPATH=${_hint}")
endif()

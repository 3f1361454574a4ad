# The Python package: whether it is built, and with which Python.
#
#   KZ_PYTHON             AUTO builds it where a Python has cffi and setuptools, and the catalogue
#                         and the tools are built too; ON stops without them; OFF leaves it out
#   KZ_PYTHON_EXECUTABLE  the system's, for which cffi is packaged, comes before others in the path
#   KZ_PYTHON_INSTALL_DIR folder of packages that `cmake --install` puts it into, such as
#                         lib/python3/dist-packages; empty at first: a wheel serves everyone else
set(KZ_PYTHON AUTO CACHE STRING "The Python package: AUTO, ON or OFF")
set_property(CACHE KZ_PYTHON PROPERTY STRINGS AUTO ON OFF)
set(KZ_PYTHON_INSTALL_DIR "" CACHE STRING "Where the Python package is installed; nowhere when empty")
find_program(KZ_PYTHON_EXECUTABLE python3 PATHS /usr/bin NO_DEFAULT_PATH)
find_program(KZ_PYTHON_EXECUTABLE python3)
mark_as_advanced(KZ_PYTHON_EXECUTABLE)

# kz_python_has(<variable> <module>...): whether all of these can be imported.
function(kz_python_has variable)
  set(found FALSE)
  if(KZ_PYTHON_EXECUTABLE)
    list(JOIN ARGN "," modules)
    execute_process(COMMAND "${KZ_PYTHON_EXECUTABLE}" -c "import ${modules}" RESULT_VARIABLE failed OUTPUT_QUIET
                                                                                             ERROR_QUIET)
    if(failed EQUAL 0)
      set(found TRUE)
    endif()
  endif()
  set(${variable} ${found} PARENT_SCOPE)
endfunction()

set(KZ_HAS_PYTHON FALSE)
string(TOUPPER "${KZ_PYTHON}" wanted)
if(NOT wanted MATCHES "^(OFF|NO|FALSE|0)$")
  kz_python_has(has_modules cffi setuptools wheel)
  set(has_libraries FALSE)
  if(KZ_BUILD_TOOLS AND KZ_BUILD_CATALOGUE AND KZ_BUILD_KZCAT AND NOT CMAKE_CROSSCOMPILING)
    set(has_libraries TRUE)
  endif()
  if(has_modules AND has_libraries)
    set(KZ_HAS_PYTHON TRUE)
  elseif(NOT wanted STREQUAL "AUTO" AND NOT has_modules)
    message(FATAL_ERROR "KZ_PYTHON is ON, and no Python was found that has cffi, setuptools and wheel.\nInstall them "
                        "(Debian: python3-cffi python3-setuptools python3-wheel), or build without the package: "
                        "-DKZ_PYTHON=OFF")
  elseif(NOT wanted STREQUAL "AUTO")
    message(FATAL_ERROR "KZ_PYTHON is ON, and the package needs the catalogue and the tools, built for this machine: "
                        "take -DKZ_BUILD_CATALOGUE=ON and -DKZ_BUILD_TOOLS=ON too, or -DKZ_PYTHON=OFF")
  elseif(has_libraries)
    message(STATUS "No Python package: cffi, setuptools or wheel was not found (Debian: python3-cffi "
                   "python3-setuptools python3-wheel)")
  endif()
endif()

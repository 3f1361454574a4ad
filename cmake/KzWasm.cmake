# The npm package: whether it is built.
#
#   KZ_WASM              AUTO builds it where Emscripten is found, but not with sanitizers or for
#                        other processors; ON stops without it; OFF leaves it out
#   KZ_WASM_INSTALL_DIR  folder that `cmake --install` puts the package into, such as
#                        share/nodejs/kzsdk; empty at first: npm installs it from its folder
set(KZ_WASM AUTO CACHE STRING "The npm package for browsers and Node: AUTO, ON or OFF")
set_property(CACHE KZ_WASM PROPERTY STRINGS AUTO ON OFF)
set(KZ_WASM_INSTALL_DIR "" CACHE STRING "Where the npm package is installed; nowhere when empty")

# Emscripten.cmake lies in Emscripten's own folder, which its compiler is a link into.
function(kz_find_emscripten)
  find_program(KZ_EMXX em++ DOC "Emscripten's compiler")
  mark_as_advanced(KZ_EMXX)
  if(KZ_EMXX)
    file(REAL_PATH "${KZ_EMXX}" compiler)
    cmake_path(GET compiler PARENT_PATH folder)
    find_file(KZ_EMSCRIPTEN_TOOLCHAIN cmake/Modules/Platform/Emscripten.cmake
              PATHS "${folder}" /usr/share/emscripten NO_DEFAULT_PATH DOC "Emscripten's settings for CMake")
    mark_as_advanced(KZ_EMSCRIPTEN_TOOLCHAIN)
  endif()
endfunction()

set(KZ_HAS_WASM FALSE)
string(TOUPPER "${KZ_WASM}" wanted)
if(wanted MATCHES "^(OFF|NO|FALSE|0)$")
  message(STATUS "No npm package: KZ_WASM is OFF")
elseif(wanted STREQUAL "AUTO" AND (KZ_SANITIZE OR KZ_COVERAGE OR CMAKE_CROSSCOMPILING OR NOT PROJECT_IS_TOP_LEVEL))
  message(STATUS "No npm package: it is of the plain build; -DKZ_WASM=ON builds it here too")
else()
  kz_find_emscripten()
  if(KZ_EMSCRIPTEN_TOOLCHAIN)
    set(KZ_HAS_WASM TRUE)
  elseif(wanted STREQUAL "AUTO")
    message(STATUS "No npm package: Emscripten was not found (Debian: emscripten)")
  else()
    message(FATAL_ERROR "KZ_WASM is ON, and Emscripten's em++ was not found.\nInstall it (Debian: emscripten), or "
                        "build without the npm package: -DKZ_WASM=OFF")
  endif()
endif()

# Installs the library, moves it elsewhere, builds a C program against it in every way that is
# offered, and compares what the programs print.
#
#   cmake -D BUILD_DIR= -D WORK_DIR= -D EXAMPLE= -D C_COMPILER= -D GENERATOR= -D LIBDIR= -P run.cmake
cmake_minimum_required(VERSION 3.22)

function(run)
  execute_process(COMMAND ${ARGV} COMMAND_ERROR_IS_FATAL ANY)
endfunction()

function(output_of variable)
  execute_process(
    COMMAND ${ARGN}
    OUTPUT_VARIABLE output
    OUTPUT_STRIP_TRAILING_WHITESPACE COMMAND_ERROR_IS_FATAL ANY)
  set(${variable} "${output}" PARENT_SCOPE)
endfunction()

file(REMOVE_RECURSE "${WORK_DIR}")
run("${CMAKE_COMMAND}" --install "${BUILD_DIR}" --prefix "${WORK_DIR}/here")
# An installed tree may be moved: no path of the first place may be needed any more.
file(RENAME "${WORK_DIR}/here" "${WORK_DIR}/moved")
set(prefix "${WORK_DIR}/moved")

run("${CMAKE_COMMAND}" -S "${CMAKE_CURRENT_LIST_DIR}" -B "${WORK_DIR}/build" -G "${GENERATOR}"
    "-DCMAKE_C_COMPILER=${C_COMPILER}" "-DCMAKE_PREFIX_PATH=${prefix}" "-DEXAMPLE=${EXAMPLE}")
run("${CMAKE_COMMAND}" --build "${WORK_DIR}/build")

set(ENV{PKG_CONFIG_PATH} "${prefix}/${LIBDIR}/pkgconfig")
output_of(flags pkg-config --cflags --libs kzsdk)
separate_arguments(flags UNIX_COMMAND "${flags}")
run("${C_COMPILER}" "${EXAMPLE}" ${flags} "-Wl,-rpath,${prefix}/${LIBDIR}" -o
    "${WORK_DIR}/build/with_pkgconfig")
output_of(flags pkg-config --static --cflags --libs kzsdk)
separate_arguments(flags UNIX_COMMAND "${flags}")
run("${C_COMPILER}" -static "${EXAMPLE}" ${flags} -o "${WORK_DIR}/build/with_pkgconfig_static")

output_of(expected "${WORK_DIR}/build/with_shared")
if(NOT expected MATCHES "COUNT=\"30\"[^>]*>([0-9]+ )+[0-9]+</FP_BLOCK>")
  message(FATAL_ERROR "Not a query document of 30 values:\n${expected}")
endif()
foreach(program IN ITEMS with_static with_pkgconfig with_pkgconfig_static)
  output_of(found "${WORK_DIR}/build/${program}")
  if(NOT found STREQUAL expected)
    message(FATAL_ERROR "${program} printed another document:\n${found}\nthan:\n${expected}")
  endif()
endforeach()

if(EXISTS "${prefix}/bin/kzfp")
  run("${prefix}/bin/kzfp" --version)
endif()

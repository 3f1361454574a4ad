# Installs the libraries, moves them elsewhere, builds a program against each in C and in C++ and in
# every way that is offered, and compares what the programs print.
#
#   cmake -D BUILD_DIR= -D WORK_DIR= -D EXAMPLES= -D C_COMPILER= -D CXX_COMPILER= -D GENERATOR=
#         -D LIBDIR= -D CATALOGUE= -P run.cmake
#
# CATALOGUE is ON where that library was built.
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
# An installed tree may be moved: no path of its first location may still be needed.
file(RENAME "${WORK_DIR}/here" "${WORK_DIR}/moved")
set(prefix "${WORK_DIR}/moved")

set(ENV{PKG_CONFIG_PATH} "${prefix}/${LIBDIR}/pkgconfig")

# build_programs(<package> <language> <source>): leaves them in <package>/<language>/ of the working
# directory.
function(build_programs package language source)
  set(build "${WORK_DIR}/${package}/${language}")
  set(compiler "${${language}_COMPILER}")
  run("${CMAKE_COMMAND}" -S "${CMAKE_CURRENT_LIST_DIR}" -B "${build}" -G "${GENERATOR}"
      "-DLANGUAGE=${language}" "-DPACKAGE=${package}" "-DCMAKE_${language}_COMPILER=${compiler}" "-DCMAKE_PREFIX_PATH=${prefix}"
      "-DEXAMPLE=${source}")
  run("${CMAKE_COMMAND}" --build "${build}")

  output_of(flags pkg-config --cflags --libs ${package})
  separate_arguments(flags UNIX_COMMAND "${flags}")
  run("${compiler}" "${source}" ${flags} "-Wl,-rpath,${prefix}/${LIBDIR}" -o "${build}/with_pkgconfig")
  output_of(flags pkg-config --static --cflags --libs ${package})
  separate_arguments(flags UNIX_COMMAND "${flags}")
  run("${compiler}" -static "${source}" ${flags} -o "${build}/with_pkgconfig_static")
endfunction()

# expect_the_same(<package> <source> <pattern>): programs of a source in C, which is C++ as well,
# print the same, and what the pattern describes.
function(expect_the_same package source pattern)
  build_programs(${package} C "${source}")
  configure_file("${source}" "${WORK_DIR}/${package}.cpp" COPYONLY)
  build_programs(${package} CXX "${WORK_DIR}/${package}.cpp")
  output_of(expected "${WORK_DIR}/${package}/C/with_shared")
  if(NOT expected MATCHES "${pattern}")
    message(FATAL_ERROR "${package}: not what was expected:\n${expected}")
  endif()
  foreach(language IN ITEMS C CXX)
    foreach(program IN ITEMS with_shared with_static with_pkgconfig with_pkgconfig_static)
      output_of(found "${WORK_DIR}/${package}/${language}/${program}")
      if(NOT found STREQUAL expected)
        message(FATAL_ERROR "${package}: ${language}/${program} printed:\n${found}\nand not:\n${expected}")
      endif()
    endforeach()
  endforeach()
endfunction()

expect_the_same(kzsdk "${EXAMPLES}/fingerprint_tune.c" "COUNT=\"30\"[^>]*>([0-9]+ )+[0-9]+</FP_BLOCK>")
if(CATALOGUE)
  expect_the_same(kzcat "${EXAMPLES}/recognise.c" "^Second tune, from second 17[.]0 on$")
  # The headers for C++ are installed too.
  output_of(flags pkg-config --cflags --libs kzcat)
  separate_arguments(flags UNIX_COMMAND "${flags}")
  run("${CXX_COMPILER}" -std=c++17 "${EXAMPLES}/recognise.cpp" ${flags} "-Wl,-rpath,${prefix}/${LIBDIR}" -o
      "${WORK_DIR}/with_headers_for_cxx")
  output_of(found "${WORK_DIR}/with_headers_for_cxx")
  if(NOT found STREQUAL "Second tune, from second 17.0 on")
    message(FATAL_ERROR "kzcat.hpp: not what was expected:\n${found}")
  endif()
endif()

if(EXISTS "${prefix}/bin/kzfp")
  run("${prefix}/bin/kzfp" --version)
endif()

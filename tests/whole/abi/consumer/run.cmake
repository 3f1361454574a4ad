# Installs the library, moves it elsewhere, builds a program against it in C and in C++ and in every
# way that is offered, and compares what the programs print.
#
#   cmake -D BUILD_DIR= -D WORK_DIR= -D EXAMPLE= -D C_COMPILER= -D CXX_COMPILER= -D GENERATOR=
#         -D LIBDIR= -P run.cmake
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

# build_programs(<language> <source>): leaves them in <language>/ of the working directory.
function(build_programs language source)
  set(build "${WORK_DIR}/${language}")
  set(compiler "${${language}_COMPILER}")
  run("${CMAKE_COMMAND}" -S "${CMAKE_CURRENT_LIST_DIR}" -B "${build}" -G "${GENERATOR}"
      "-DLANGUAGE=${language}" "-DCMAKE_${language}_COMPILER=${compiler}" "-DCMAKE_PREFIX_PATH=${prefix}"
      "-DEXAMPLE=${source}")
  run("${CMAKE_COMMAND}" --build "${build}")

  output_of(flags pkg-config --cflags --libs kzsdk)
  separate_arguments(flags UNIX_COMMAND "${flags}")
  run("${compiler}" "${source}" ${flags} "-Wl,-rpath,${prefix}/${LIBDIR}" -o "${build}/with_pkgconfig")
  output_of(flags pkg-config --static --cflags --libs kzsdk)
  separate_arguments(flags UNIX_COMMAND "${flags}")
  run("${compiler}" -static "${source}" ${flags} -o "${build}/with_pkgconfig_static")
endfunction()

# The example is C, and C++ as well.
build_programs(C "${EXAMPLE}")
configure_file("${EXAMPLE}" "${WORK_DIR}/example.cpp" COPYONLY)
build_programs(CXX "${WORK_DIR}/example.cpp")

output_of(expected "${WORK_DIR}/C/with_shared")
if(NOT expected MATCHES "COUNT=\"30\"[^>]*>([0-9]+ )+[0-9]+</FP_BLOCK>")
  message(FATAL_ERROR "Not a query document of 30 values:\n${expected}")
endif()
foreach(language IN ITEMS C CXX)
  foreach(program IN ITEMS with_shared with_static with_pkgconfig with_pkgconfig_static)
    output_of(found "${WORK_DIR}/${language}/${program}")
    if(NOT found STREQUAL expected)
      message(FATAL_ERROR "${language}/${program} printed another document:\n${found}\nthan:\n${expected}")
    endif()
  endforeach()
endforeach()

if(EXISTS "${prefix}/bin/kzfp")
  run("${prefix}/bin/kzfp" --version)
endif()

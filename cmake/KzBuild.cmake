# Compiler settings shared by all targets, and the functions in which tests are declared.

if(NOT CMAKE_BUILD_TYPE AND NOT CMAKE_CONFIGURATION_TYPES)
  set(CMAKE_BUILD_TYPE Release CACHE STRING "Build type" FORCE)
endif()

set(CMAKE_CXX_STANDARD 20)
set(CMAKE_CXX_STANDARD_REQUIRED ON)
set(CMAKE_CXX_EXTENSIONS OFF)
set(CMAKE_C_STANDARD 99)
set(CMAKE_C_STANDARD_REQUIRED ON)
set(CMAKE_C_EXTENSIONS OFF)
set(CMAKE_EXPORT_COMPILE_COMMANDS ON)

add_library(kz_settings INTERFACE)
# Sums and products keep the bits that the source states: no contraction, no x87 registers.
target_compile_options(kz_settings INTERFACE -ffp-contract=off)
if(CMAKE_SYSTEM_PROCESSOR MATCHES "^(i[3-6]86|x86|x86_64|amd64|AMD64)$" AND CMAKE_SIZEOF_VOID_P EQUAL 4)
  target_compile_options(kz_settings INTERFACE -msse2 -mfpmath=sse)
endif()
if(EMSCRIPTEN)
  # In every object, so that exceptions and vectors are of one kind in all of them.
  target_compile_options(
    kz_settings INTERFACE -msimd128
                          "$<$<COMPILE_LANGUAGE:CXX>:-fwasm-exceptions;SHELL:-include \"${PROJECT_SOURCE_DIR}/bindings/wasm/native/missing_library.hpp\">")
  target_link_options(kz_settings INTERFACE -msimd128 -fwasm-exceptions)
endif()
target_compile_options(kz_settings INTERFACE -Wall -Wextra -Wconversion -Wsign-conversion -Wshadow)
if(KZ_WERROR)
  target_compile_options(kz_settings INTERFACE -Werror)
endif()
if(KZ_SANITIZE)
  target_compile_options(kz_settings INTERFACE -fsanitize=${KZ_SANITIZE} -fno-omit-frame-pointer
                                               -fno-sanitize-recover=all)
  target_link_options(kz_settings INTERFACE -fsanitize=${KZ_SANITIZE})
  if(KZ_SANITIZE MATCHES "integer")
    # Unsigned numbers may wrap; this sanitizer reports where that is not intended.
    target_compile_options(
      kz_settings INTERFACE "-fsanitize-ignorelist=${PROJECT_SOURCE_DIR}/cmake/integer_ignorelist.txt")
  endif()
endif()
if(KZ_COVERAGE)
  target_compile_options(kz_settings INTERFACE -fprofile-instr-generate -fcoverage-mapping)
  target_link_options(kz_settings INTERFACE -fprofile-instr-generate)
endif()

# What a compiler and a linker can do against the exploitation of a bug.
# tests/whole/abi/hardening_test.cpp looks for it in the built files. A sanitizer detects more, and
# some of its checks do not work together with these.
option(KZ_HARDEN "Compile and link with the usual protections" ON)
if(KZ_HARDEN AND NOT KZ_SANITIZE)
  include(CheckCXXCompilerFlag)
  # A call needs up to 100 KB of stack: it must not step over the guard behind a small one.
  foreach(flag -fstack-protector-strong -fstack-clash-protection -fcf-protection=full
          -mbranch-protection=standard)
    string(MAKE_C_IDENTIFIER "KZ_HAS${flag}" known)
    check_cxx_compiler_flag("${flag} -Werror" ${known})
    if(${known})
      target_compile_options(kz_settings INTERFACE ${flag})
    endif()
  endforeach()
  # Debug builds do not optimise, and the C library's checks need that.
  target_compile_options(
    kz_settings INTERFACE "$<$<NOT:$<CONFIG:Debug>>:SHELL:-U_FORTIFY_SOURCE -D_FORTIFY_SOURCE=2>")
  if(NOT APPLE)
    target_link_options(kz_settings INTERFACE -Wl,-z,relro -Wl,-z,now -Wl,-z,noexecstack)
  endif()
  # The kernels' scratch, tens of KB on the stack, is written before it is read: clearing it first
  # would cost more than some of the loops. Only their files are compiled without it.
  check_cxx_compiler_flag("-ftrivial-auto-var-init=zero -Werror" KZ_HAS_AUTO_VAR_INIT)
endif()

# What is shipped does not reveal where it was built: the same sources give the same bytes in any
# folder. Debuggers and coverage tools want the real names, and get them in the other builds.
target_compile_options(
  kz_settings
  INTERFACE
    "$<$<CONFIG:Release,MinSizeRel>:-ffile-prefix-map=${PROJECT_BINARY_DIR}=build;-ffile-prefix-map=${PROJECT_SOURCE_DIR}=.>")

# Objects that go into a library.
function(kz_objects target)
  add_library(${target} OBJECT ${ARGN})
  target_link_libraries(${target} PRIVATE kz_settings)
  target_include_directories(${target} PRIVATE "${PROJECT_SOURCE_DIR}")
  if(KZ_HAS_AUTO_VAR_INIT AND KZ_HARDEN AND NOT KZ_SANITIZE)
    target_compile_options(${target} PRIVATE -ftrivial-auto-var-init=zero)
  endif()
  set_target_properties(
    ${target} PROPERTIES LINKER_LANGUAGE CXX POSITION_INDEPENDENT_CODE ON CXX_VISIBILITY_PRESET hidden
                         VISIBILITY_INLINES_HIDDEN ON)
  if(EMSCRIPTEN)
    set_target_properties(${target} PROPERTIES POSITION_INDEPENDENT_CODE OFF) # a module is loaded once
  endif()
endfunction()

# Those of kzsdk, which nothing of the C++ run-time library serves.
function(kz_library_objects target)
  kz_objects(${target} ${ARGN})
  target_compile_options(${target} PRIVATE -fno-exceptions -fno-rtti)
endfunction()

# kz_instruction_set(<sse41 | avx2 | avx512 | neon> <file>...)
#
# These files of the folder hold inner loops for processors with this instruction set, and are
# compiled for them; what the processor runs is chosen when the program runs. On another
# architecture such a file must be empty. What it defines must not serve elsewhere: an inline
# function of a header that the linker took from it would end the program on other processors.
# tests/whole/variants looks for such.
function(kz_instruction_set set)
  set(options "")
  if(CMAKE_SYSTEM_PROCESSOR MATCHES "^(i[3-6]86|x86|x86_64|amd64|AMD64)$")
    set(options_sse41 -msse4.1)
    set(options_avx2 -mavx2)
    set(options_avx512 -mavx2 -mavx512f -mavx512bw -mavx512vpopcntdq)
    set(options ${options_${set}})
  elseif(CMAKE_SYSTEM_PROCESSOR STREQUAL "wasm32" AND set STREQUAL "sse41")
    set(options -msse4.1) # intrinsics, which become those of WebAssembly
  endif()
  # Scratch of the loops is written before it is read.
  if(KZ_HAS_AUTO_VAR_INIT)
    list(APPEND options -ftrivial-auto-var-init=uninitialized)
  endif()
  set_property(SOURCE ${ARGN} APPEND PROPERTY COMPILE_OPTIONS ${options})
  # For tests/whole/variants.
  cmake_path(RELATIVE_PATH CMAKE_CURRENT_SOURCE_DIR BASE_DIRECTORY "${PROJECT_SOURCE_DIR}" OUTPUT_VARIABLE folder)
  set_property(GLOBAL APPEND PROPERTY KZ_VARIANTS_IN_${folder} ${ARGN})
endfunction()

# Tests are compiled once and run once: they are optimised little, and share what they all include.
# Compiler caches do better without a precompiled header, and clang-tidy cannot read another
# compiler's.
if(CMAKE_CXX_COMPILER_LAUNCHER OR CMAKE_CROSSCOMPILING)
  option(KZ_PRECOMPILE "Precompile the headers that all tests include" OFF)
else()
  option(KZ_PRECOMPILE "Precompile the headers that all tests include" ON)
endif()

# kz_compile_quickly(<target>): a test program, or what only these use.
function(kz_compile_quickly target)
  target_compile_options(${target} PRIVATE $<$<CONFIG:Release,RelWithDebInfo>:-O1>)
  # At this level g++ 12 takes strings that are put together for too short.
  if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU")
    target_compile_options(
      ${target} PRIVATE "$<$<COMPILE_LANGUAGE:CXX>:-Wno-array-bounds;-Wno-stringop-overflow;-Wno-stringop-overread>")
  endif()
  if(KZ_PRECOMPILE)
    target_precompile_headers(${target} REUSE_FROM kz_test_headers)
    # As in the rooms that handle large files: the header serves only those that agree with it.
    target_compile_definitions(${target} PRIVATE _FILE_OFFSET_BITS=64)
  endif()
endfunction()

# kz_test(<file>_test [ROOMS <room>...] [LIBS <target>...] [SOURCES <file>...] [FIXTURE <name>]
#         [TOGETHER])
#
# Builds <file>_test.cpp of this folder over its room's objects and everything below, with the
# allocator wrapped so that tests can count blocks and make the n-th allocation fail, and registers
# each of its test cases with CTest. The room is the one that the folder mirrors, unless ROOMS names
# others: tests/library/<room> for kzsdk's, tests/catalogue/<room> for the catalogue's. The target
# is <room>_<file>_test, with kzcat_ before it for the catalogue's. FIXTURE names what has to be set
# up first. TOGETHER registers the whole program as one test: for those that start what all share.
function(kz_test file)
  cmake_parse_arguments(PARSE_ARGV 1 test "TOGETHER" "FIXTURE" "ROOMS;LIBS;SOURCES")
  kz_mirrored_room(room target)
  string(APPEND target "_${file}")
  if(NOT test_ROOMS)
    set(test_ROOMS ${room})
  endif()
  kz_room_closure(rooms ${test_ROOMS})
  kz_room_objects(objects ${rooms})
  kz_record_test(${target} ${rooms})
  add_executable(${target} ${file}.cpp ${test_SOURCES})
  kz_compile_quickly(${target})
  target_link_libraries(${target} PRIVATE kz_settings ${objects} kz_test_support ${test_LIBS})
  if(test_TOGETHER)
    add_test(NAME ${target} COMMAND ${target})
    set_tests_properties(${target} PROPERTIES TIMEOUT 600)
  else()
    kz_register_test(${target} ${test_FIXTURE})
  endif()
  if(target MATCHES "^kzcat_")
    add_dependencies(catalogue_tests ${target})
    file(STRINGS ${file}.cpp starts_threads REGEX "#include <(thread|future|pthread.h)>")
    if(starts_threads)
      add_dependencies(catalogue_thread_tests ${target})
    endif()
  endif()
endfunction()

# kz_public_test(<file>_test [LIBS <target>...] [SOURCES <file>...])
#
# A test that sees the library as a user does: linked against the shared library, public names only.
function(kz_public_test file)
  cmake_parse_arguments(PARSE_ARGV 1 test "" "" "LIBS;SOURCES")
  cmake_path(GET CMAKE_CURRENT_SOURCE_DIR FILENAME folder)
  set(target ${folder}_${file})
  get_property(rooms GLOBAL PROPERTY KZ_ROOMS_OF_kzsdk)
  kz_record_test(${target} ${rooms})
  add_executable(${target} ${file}.cpp ${test_SOURCES})
  kz_compile_quickly(${target})
  target_link_libraries(${target} PRIVATE kz_settings kzsdk_shared GTest::gtest_main ${test_LIBS})
  target_include_directories(${target} PRIVATE "${PROJECT_SOURCE_DIR}/tests")
  kz_register_test(${target})
endfunction()

# Any further argument is a fixture.
function(kz_register_test target)
  set(fixture "")
  if(ARGN)
    set(fixture FIXTURES_REQUIRED ${ARGN})
  endif()
  # An emulator takes up to fifty times as long.
  set(timeout 600)
  if(CMAKE_CROSSCOMPILING)
    set(timeout 7200)
  endif()
  gtest_discover_tests(${target} TEST_PREFIX "${target}." DISCOVERY_TIMEOUT 60 PROPERTIES TIMEOUT ${timeout}
                                                                                          ${fixture})
endfunction()

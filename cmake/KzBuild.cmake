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

# Objects that go into the library.
function(kz_library_objects target)
  add_library(${target} OBJECT ${ARGN})
  target_link_libraries(${target} PRIVATE kz_settings)
  target_include_directories(${target} PRIVATE "${PROJECT_SOURCE_DIR}")
  target_compile_options(${target} PRIVATE -fno-exceptions -fno-rtti)
  if(KZ_HAS_AUTO_VAR_INIT AND KZ_HARDEN AND NOT KZ_SANITIZE)
    target_compile_options(${target} PRIVATE -ftrivial-auto-var-init=zero)
  endif()
  set_target_properties(
    ${target} PROPERTIES POSITION_INDEPENDENT_CODE ON CXX_VISIBILITY_PRESET hidden
                         VISIBILITY_INLINES_HIDDEN ON)
endfunction()

# kz_test(<file>_test [ROOMS <room>...] [LIBS <target>...] [FIXTURE <name>])
#
# Builds <file>_test.cpp of this folder over its room's objects and everything below, with the
# allocator wrapped so that tests can count blocks and make the n-th allocation fail, and registers
# each of its test cases with CTest. The folder's name is the room's, unless ROOMS names others, and
# the target is <folder>_<file>_test. FIXTURE names what has to be set up first.
function(kz_test file)
  cmake_parse_arguments(PARSE_ARGV 1 test "" "FIXTURE" "ROOMS;LIBS;SOURCES")
  cmake_path(GET CMAKE_CURRENT_SOURCE_DIR FILENAME folder)
  set(target ${folder}_${file})
  if(NOT test_ROOMS)
    set(test_ROOMS ${folder})
  endif()
  kz_room_closure(rooms ${test_ROOMS})
  kz_room_objects(objects ${test_ROOMS})
  kz_record_test(${target} ${rooms})
  add_executable(${target} ${file}.cpp ${test_SOURCES})
  target_link_libraries(${target} PRIVATE kz_settings ${objects} kz_test_support ${test_LIBS})
  kz_register_test(${target} ${test_FIXTURE})
endfunction()

# kz_public_test(<file>_test [LIBS <target>...] [SOURCES <file>...])
#
# A test that sees the library as a user does: linked against the shared library, public names only.
function(kz_public_test file)
  cmake_parse_arguments(PARSE_ARGV 1 test "" "" "LIBS;SOURCES")
  cmake_path(GET CMAKE_CURRENT_SOURCE_DIR FILENAME folder)
  set(target ${folder}_${file})
  get_property(rooms GLOBAL PROPERTY KZ_ROOMS)
  kz_record_test(${target} ${rooms})
  add_executable(${target} ${file}.cpp ${test_SOURCES})
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

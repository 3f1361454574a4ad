# The table generator, for a native build and for the host's part of a cross build.
add_executable(tablegen "${CMAKE_CURRENT_LIST_DIR}/tablegen.cpp"
                        "${CMAKE_CURRENT_LIST_DIR}/../kzsdk/abs/mathfn.cpp")
target_include_directories(tablegen PRIVATE "${CMAKE_CURRENT_LIST_DIR}/..")
target_compile_features(tablegen PRIVATE cxx_std_20)
target_compile_options(tablegen PRIVATE -ffp-contract=off)
if(CMAKE_SYSTEM_PROCESSOR MATCHES "^(i[3-6]86|x86|x86_64|AMD64)$" AND CMAKE_SIZEOF_VOID_P EQUAL 4)
  target_compile_options(tablegen PRIVATE -msse2 -mfpmath=sse)
endif()

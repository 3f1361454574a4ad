# Packs an AAR: classes for Java, a library for each ABI, and a Prefab package for native users.
#
#   cmake -D JAR=kzsdk.jar -D "LIBRARIES=arm64-v8a=path/libkzsdk.so;x86_64=path/libkzsdk.so"
#         -D VERSION=1.0.0 -D NDK=27 -D READELF=llvm-readelf -D WORK_DIR=scratch -D OUT=kzsdk.aar
#         -P aar.cmake
cmake_minimum_required(VERSION 3.22)

set(MIN_SDK 24)
set(abis arm64-v8a armeabi-v7a x86_64 x86)

foreach(variable JAR LIBRARIES VERSION NDK READELF WORK_DIR OUT)
  if(NOT DEFINED ${variable})
    message(FATAL_ERROR "aar.cmake: ${variable} is missing")
  endif()
endforeach()

cmake_path(ABSOLUTE_PATH OUT)
cmake_path(GET CMAKE_CURRENT_LIST_DIR PARENT_PATH root)
file(REMOVE_RECURSE "${WORK_DIR}")
configure_file("${root}/bindings/android/AndroidManifest.xml" "${WORK_DIR}/AndroidManifest.xml" @ONLY)
configure_file("${root}/bindings/android/consumer-rules.pro" "${WORK_DIR}/proguard.txt" COPYONLY)
configure_file("${JAR}" "${WORK_DIR}/classes.jar" COPYONLY)
configure_file("${root}/LICENSE" "${WORK_DIR}/LICENSE" COPYONLY)
file(WRITE "${WORK_DIR}/R.txt" "")

set(prefab "${WORK_DIR}/prefab")
set(module "${prefab}/modules/kzsdk")
file(WRITE "${prefab}/prefab.json"
     "{\"schema_version\": 2, \"name\": \"kzsdk\", \"version\": \"${VERSION}\", \"dependencies\": []}\n")
file(WRITE "${module}/module.json" "{\"export_libraries\": [], \"library_name\": \"libkzsdk\"}\n")
# Every .h of the library is public.
file(GLOB_RECURSE headers RELATIVE "${root}/kzsdk" "${root}/kzsdk/*.h")
foreach(header IN LISTS headers)
  configure_file("${root}/kzsdk/${header}" "${module}/include/kzsdk/${header}" COPYONLY)
endforeach()

# Newer devices have memory pages of 16 KiB, and do not load what is aligned to less.
function(check_alignment library)
  execute_process(COMMAND "${READELF}" -lW "${library}" OUTPUT_VARIABLE segments COMMAND_ERROR_IS_FATAL ANY)
  string(REGEX MATCHALL "LOAD [^\n]*" loads "${segments}")
  foreach(load IN LISTS loads)
    string(REGEX MATCH "0x([0-9a-f]+) *$" alignment "${load}")
    math(EXPR rest "${CMAKE_MATCH_0} % 16384")
    if(NOT rest EQUAL 0)
      message(FATAL_ERROR "aar.cmake: ${library} does not load where pages have 16 KiB; link it with "
                          "-Wl,-z,max-page-size=16384:\n${load}")
    endif()
  endforeach()
  if(NOT loads)
    message(FATAL_ERROR "aar.cmake: ${READELF} found no segments in ${library}")
  endif()
endfunction()

foreach(entry IN LISTS LIBRARIES)
  if(NOT entry MATCHES "^([^=]+)=(.+)$" OR NOT CMAKE_MATCH_1 IN_LIST abis)
    message(FATAL_ERROR "aar.cmake: not <abi>=<library>: ${entry}")
  endif()
  set(abi ${CMAKE_MATCH_1})
  set(library "${CMAKE_MATCH_2}")
  check_alignment("${library}")
  configure_file("${library}" "${WORK_DIR}/jni/${abi}/libkzsdk.so" COPYONLY)
  configure_file("${library}" "${module}/libs/android.${abi}/libkzsdk.so" COPYONLY)
  # No C++ type crosses the interface, and no C++ run-time library is needed: any will do.
  file(WRITE "${module}/libs/android.${abi}/abi.json"
       "{\"abi\": \"${abi}\", \"api\": ${MIN_SDK}, \"ndk\": ${NDK}, \"stl\": \"none\", \"static\": false}\n")
endforeach()

execute_process(
  COMMAND "${CMAKE_COMMAND}" -E tar cf "${OUT}" --format=zip AndroidManifest.xml LICENSE R.txt
          classes.jar jni prefab proguard.txt
  WORKING_DIRECTORY "${WORK_DIR}" COMMAND_ERROR_IS_FATAL ANY)

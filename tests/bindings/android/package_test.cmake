# Packs an AAR and looks into it.
cmake_minimum_required(VERSION 3.22)

function(expect text pattern what)
  if(NOT text MATCHES "${pattern}")
    message(SEND_ERROR "${what}: no \"${pattern}\" in\n${text}")
  endif()
endfunction()

function(output_of variable)
  execute_process(COMMAND ${ARGN} OUTPUT_VARIABLE output COMMAND_ERROR_IS_FATAL ANY)
  set(${variable} "${output}" PARENT_SCOPE)
endfunction()

set(aar "${WORK_DIR}/not_for_devices.aar")
file(MAKE_DIRECTORY "${WORK_DIR}")
output_of(ignored "${CMAKE_COMMAND}" -D "JAR=${JAR}" -D "LIBRARIES=x86_64=${LIBRARY}" -D
          "VERSION=${VERSION}" -D NDK=27 -D "READELF=${READELF}" -D "WORK_DIR=${WORK_DIR}/scratch" -D "OUT=${aar}" -P
          "${ROOT}/packaging/aar.cmake")

set(tree "${WORK_DIR}/unpacked")
file(REMOVE_RECURSE "${tree}")
file(ARCHIVE_EXTRACT INPUT "${aar}" DESTINATION "${tree}")
file(GLOB_RECURSE files RELATIVE "${tree}" "${tree}/*")
list(SORT files)
set(module prefab/modules/kzsdk)
set(expected
    AndroidManifest.xml
    LICENSE
    R.txt
    classes.jar
    jni/x86_64/libkzsdk.so
    ${module}/libs/android.x86_64/abi.json
    ${module}/libs/android.x86_64/libkzsdk.so
    ${module}/module.json
    prefab/prefab.json
    proguard.txt)
foreach(header IN LISTS HEADERS ITEMS "${ROOT}/kzsdk/kzsdk.h")
  file(RELATIVE_PATH place "${ROOT}" "${header}")
  list(APPEND expected "${module}/include/${place}")
endforeach()
list(SORT expected)
if(NOT files STREQUAL expected)
  message(SEND_ERROR "The package holds\n${files}\nand not\n${expected}")
endif()

file(READ "${tree}/AndroidManifest.xml" manifest)
expect("${manifest}" "package=\"com.orvanta.android.kzsdk\"" manifest)
expect("${manifest}" "minSdkVersion=\"24\"" manifest)
file(READ "${tree}/${module}/libs/android.x86_64/abi.json" abi)
string(JSON stl GET "${abi}" stl)
string(JSON api GET "${abi}" api)
expect("${stl} ${api}" "^none 24$" "abi.json")
file(READ "${tree}/prefab/prefab.json" package)
string(JSON schema GET "${package}" schema_version)
string(JSON name GET "${package}" name)
expect("${schema} ${name}" "^2 kzsdk$" "prefab.json")
file(READ "${tree}/${module}/module.json" about)
string(JSON library GET "${about}" library_name)
expect("${library}" "^libkzsdk$" "module.json")

# Every member that the native side binds stands in the keep rules as the class declares it.
file(READ "${tree}/proguard.txt" rules)
output_of(members "${JAVAP}" -p -classpath "${tree}/classes.jar" com.orvanta.android.kzsdk.Fingerprint)
string(REGEX MATCHALL "[^;\n]*(native|mNativeContext|postEventFromNative)[^;\n]*" bound "${members}")
list(LENGTH bound count)
if(NOT count EQUAL 7)
  message(SEND_ERROR "the class binds ${count} members:\n${bound}")
endif()
foreach(member IN LISTS bound)
  string(REGEX REPLACE "^ *private " "" member "${member}")
  string(FIND "${rules}" "    ${member};" found)
  if(found EQUAL -1)
    message(SEND_ERROR "no keep rule for: ${member}")
  endif()
endforeach()

# The library exports the names of its list under the version of the interface, and nothing else.
file(READ "${MAP}" map)
string(REGEX REPLACE "#[^\n]*" "" map "${map}")
string(REGEX REPLACE "local:.*" "" map "${map}")
string(REGEX REPLACE ".*global:" "" map "${map}")
string(REGEX MATCHALL "[A-Za-z_0-9]+" names "${map}")
list(SORT names)
output_of(exported "${NM}" -D --defined-only --format=posix "${tree}/jni/x86_64/libkzsdk.so")
string(REGEX MATCHALL "[^\n]+" exported "${exported}")
# The version itself; the tools of LLVM write it as one of its own names.
list(FILTER exported EXCLUDE REGEX "^KZSDK_1[.]0(@@KZSDK_1[.]0)? A ")
list(TRANSFORM exported REPLACE "@@KZSDK_1\\.0 T .*" "")
list(SORT exported)
if(NOT exported STREQUAL names)
  message(SEND_ERROR "The library exports\n${exported}\nand not\n${names}")
endif()

# It loads where pages have 16 KiB.
output_of(segments "${READELF}" -lW "${tree}/jni/x86_64/libkzsdk.so")
string(REGEX MATCHALL "LOAD [^\n]*" loads "${segments}")
foreach(load IN LISTS loads)
  expect("${load}" "0x4000 *$" "alignment")
endforeach()

# A library that does not is not packed.
file(WRITE "${WORK_DIR}/small_pages.c" "int kz_small_pages(void) { return 1; }\n")
set(small "${WORK_DIR}/small_pages.so")
output_of(ignored "${CC}" -shared -fPIC -nostdlib -Wl,-z,max-page-size=4096 -o "${small}" "${WORK_DIR}/small_pages.c")
execute_process(
  COMMAND "${CMAKE_COMMAND}" -D "JAR=${JAR}" -D "LIBRARIES=x86_64=${small}" -D "VERSION=${VERSION}" -D NDK=27 -D
          "READELF=${READELF}" -D "WORK_DIR=${WORK_DIR}/scratch" -D "OUT=${WORK_DIR}/small_pages.aar" -P
          "${ROOT}/packaging/aar.cmake"
  RESULT_VARIABLE result ERROR_VARIABLE error)
if(result EQUAL 0 OR EXISTS "${WORK_DIR}/small_pages.aar")
  message(SEND_ERROR "A library for pages of 4 KiB was packed")
endif()
expect("${error}" "max-page-size=16384" "reason")

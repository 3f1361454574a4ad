# What the libraries export depends on the options, never on what the machine has: without a jni.h,
# a JDK, SQLite or a Python that was asked for the configuration stops and names its cures.
#
#   cmake -D ROOT= -D WORK_DIR= -D C_COMPILER= -D CXX_COMPILER= -D GENERATOR=
#         -P configuration_test.cmake
cmake_minimum_required(VERSION 3.22)

set(common -G "${GENERATOR}" "-DCMAKE_C_COMPILER=${C_COMPILER}" "-DCMAKE_CXX_COMPILER=${CXX_COMPILER}"
           -DCMAKE_BUILD_TYPE=Release)
set(alone -DKZ_BUILD_TESTS=OFF -DKZ_BUILD_TOOLS=OFF)
# As on a machine on which nothing of Java is found.
set(no_java -DCMAKE_DISABLE_FIND_PACKAGE_Java=ON -DKZ_JNI_INCLUDE_DIR=)

# configure(<name> <source> <option>...): sets `status` and `said`, without line ends, in the
# caller.
function(configure name source)
  file(REMOVE_RECURSE "${WORK_DIR}/${name}")
  execute_process(
    COMMAND "${CMAKE_COMMAND}" -S "${source}" -B "${WORK_DIR}/${name}" ${common} ${ARGN}
    RESULT_VARIABLE status OUTPUT_VARIABLE said ERROR_VARIABLE said)
  string(REGEX REPLACE "[ \n]+" " " said "${said}")
  set(status "${status}" PARENT_SCOPE)
  set(said "${said}" PARENT_SCOPE)
endfunction()

function(expect_stop name)
  if(status EQUAL 0)
    message(SEND_ERROR "${name}: was configured, and should have stopped")
  endif()
  foreach(words IN LISTS ARGN)
    string(FIND "${said}" "${words}" found)
    if(found EQUAL -1)
      message(SEND_ERROR "${name}: does not say \"${words}\", but\n${said}")
    endif()
  endforeach()
endfunction()

# What a configured build decided, from its cache.
function(expect_setting name setting value)
  if(NOT status EQUAL 0)
    message(SEND_ERROR "${name}: not configured:\n${said}")
    return()
  endif()
  load_cache("${WORK_DIR}/${name}" READ_WITH_PREFIX found_ ${setting})
  if(NOT found_${setting} STREQUAL value)
    message(SEND_ERROR "${name}: ${setting} is ${found_${setting}}, not ${value}")
  endif()
endfunction()

configure(no_header "${ROOT}" ${alone} ${no_java})
expect_stop(no_header "needs a jni.h" default-jdk-headless android-libnativehelper-dev -DKZ_JNI=OFF)

configure(no_jdk "${ROOT}" ${alone} -DCMAKE_DISABLE_FIND_PACKAGE_Java=ON -DKZ_JAVA=ON)
expect_stop(no_jdk "needs javac and jar" default-jdk-headless -DKZ_JAVA=OFF)

configure(no_front "${ROOT}" ${alone} -DKZ_JNI=OFF -DKZ_JAVA=ON)
expect_stop(no_front "leaves out" -DKZ_JAVA=OFF)

configure(by_itself "${ROOT}" ${alone})
expect_setting(by_itself KZ_JNI ON)
expect_setting(by_itself KZ_JAVA OFF)
expect_setting(by_itself KZ_SMALL_MAP OFF)
expect_setting(by_itself KZ_BUILD_CATALOGUE OFF)

set(no_sqlite -DCMAKE_DISABLE_FIND_PACKAGE_SQLite3=ON)
configure(no_sqlite "${ROOT}" ${alone} ${no_sqlite} -DKZ_BUILD_CATALOGUE=ON)
expect_stop(no_sqlite "needs SQLite 3.40 or later" libsqlite3-dev -DKZ_BUILD_CATALOGUE=OFF)

configure(no_database "${ROOT}" ${alone} ${no_sqlite} -DKZ_BUILD_CATALOGUE=ON -DKZ_SQLITE=OFF)
expect_setting(no_database KZ_SQLITE OFF)

configure(no_server "${ROOT}" ${alone} -DKZ_BUILD_CATALOGUE=ON -DKZ_POSTGRESQL=OFF)
expect_setting(no_server KZ_POSTGRESQL OFF)

configure(no_catalogue "${ROOT}" -DKZ_BUILD_TESTS=OFF -DKZ_BUILD_TOOLS=ON -DKZ_BUILD_CATALOGUE=OFF)
expect_stop(no_catalogue "uses the catalogue" -DKZ_BUILD_CATALOGUE=ON -DKZ_BUILD_TOOLS=OFF)

configure(no_python "${ROOT}" ${alone} -DKZ_PYTHON=ON -DKZ_PYTHON_EXECUTABLE=/bin/false)
expect_stop(no_python "no Python was found that has cffi" python3-cffi -DKZ_PYTHON=OFF)

file(WRITE "${WORK_DIR}/another/CMakeLists.txt"
     "cmake_minimum_required(VERSION 3.22)\nproject(another C CXX)\nadd_subdirectory(\"${ROOT}\" kzsdk)\n")
configure(as_a_part "${WORK_DIR}/another" ${no_java})
expect_setting(as_a_part KZ_JNI OFF)
expect_setting(as_a_part KZ_BUILD_CATALOGUE OFF)

# A JDK that comes after the first configuration is used by the next one.
configure(later "${ROOT}" ${alone} -DCMAKE_DISABLE_FIND_PACKAGE_Java=ON)
execute_process(
  COMMAND "${CMAKE_COMMAND}" -S "${ROOT}" -B "${WORK_DIR}/later" -DCMAKE_DISABLE_FIND_PACKAGE_Java=OFF
  RESULT_VARIABLE status OUTPUT_QUIET ERROR_VARIABLE said)
file(READ "${WORK_DIR}/later/compile_commands.json" commands)
if(NOT status EQUAL 0 OR commands MATCHES "android/nativehelper")
  message(SEND_ERROR "later: the header of the JDK is not used:\n${said}")
endif()

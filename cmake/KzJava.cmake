# The Java front: whether it is built, over which platform, and which names leave the library. None
# of it depends on what the machine that builds happens to have: what is missing stops the
# configuration.
#
#   KZ_JNI       build the front into the library: it costs a few kilobytes, and makes the library
#                one that Java can load. Needs a jni.h. Default: ON, and OFF where kzsdk is a
#                part of another build
#   KZ_JAVA      build kzsdk.jar, the front's Java side. Needs a JDK. Default: OFF; the presets have
#                it ON
#   KZ_KOTLIN    build kzsdk-kotlin.jar, Kotlin's extensions. Needs kotlinc. Default: OFF
#   KZ_PLATFORM  what the front logs to and starts threads with: see
#                kzsdk/jni/platform/platform.hpp. Default: portable, which needs nothing and so
#                loads anywhere; ndk when building for Android
#   KZ_SMALL_MAP export only the extraction interface, start-up and what Java needs. Default: OFF
option(KZ_JNI "Build the front that a Java VM loads" ${PROJECT_IS_TOP_LEVEL})
option(KZ_JAVA "Build kzsdk.jar, the front's Java side" OFF)
option(KZ_KOTLIN "Build kzsdk-kotlin.jar, Kotlin's extensions" OFF)
option(KZ_SMALL_MAP "Export only the extraction interface, start-up and JNI_OnLoad" OFF)

find_package(Java 1.8 COMPONENTS Development Runtime QUIET)
if(Java_JAVAC_EXECUTABLE)
  file(REAL_PATH "${Java_JAVAC_EXECUTABLE}" javac)
  cmake_path(GET javac PARENT_PATH bin)
  cmake_path(GET bin PARENT_PATH KZ_JAVA_HOME)
endif()
# Looked for at every configuration: a JDK that was installed after the first one comes before
# Android's header, which may have served until then.
if(ANDROID)
  find_path(KZ_JNI_INCLUDE_DIR jni.h NO_CACHE)
else()
  find_path(KZ_JNI_INCLUDE_DIR jni.h HINTS "${KZ_JAVA_HOME}/include" "$ENV{JAVA_HOME}/include"
            PATH_SUFFIXES android/nativehelper NO_CACHE)
endif()
find_path(KZ_JNI_MD_INCLUDE_DIR jni_md.h HINTS "${KZ_JNI_INCLUDE_DIR}/linux"
          "${KZ_JNI_INCLUDE_DIR}/darwin" NO_CACHE)

set(platform_default portable)
if(ANDROID)
  set(platform_default ndk)
endif()
set(KZ_PLATFORM ${platform_default} CACHE STRING "Log and threads of the Java front")
set_property(CACHE KZ_PLATFORM PROPERTY STRINGS portable ndk aosp)
if(NOT KZ_PLATFORM MATCHES "^(portable|ndk|aosp)$")
  message(FATAL_ERROR "KZ_PLATFORM is portable, ndk or aosp, not ${KZ_PLATFORM}")
endif()

if(KZ_JNI AND NOT KZ_JNI_INCLUDE_DIR)
  message(FATAL_ERROR "KZ_JNI, the front that a Java VM loads, needs a jni.h, and there is none.\n"
                      "Install a JDK (Debian: default-jdk-headless; elsewhere set JAVA_HOME), or the header alone "
                      "(Debian: android-libnativehelper-dev), or build without the front: -DKZ_JNI=OFF")
endif()

add_library(kz_jni_headers INTERFACE)
if(KZ_JNI AND NOT ANDROID)
  target_include_directories(kz_jni_headers SYSTEM INTERFACE "${KZ_JNI_INCLUDE_DIR}")
  if(KZ_JNI_MD_INCLUDE_DIR)
    target_include_directories(kz_jni_headers SYSTEM INTERFACE "${KZ_JNI_MD_INCLUDE_DIR}")
  endif()
endif()

# Android's log and threads: in the NDK's system root, or as Debian packages them for a desktop.
if(ANDROID)
  set(KZ_ANDROID_LOG_LIBRARY log)
else()
  find_path(KZ_ANDROID_INCLUDE_DIR android/log.h HINTS /usr/include/android)
  find_library(KZ_ANDROID_LOG_LIBRARY log PATH_SUFFIXES android)
  find_library(KZ_ANDROID_UTILS_LIBRARY utils PATH_SUFFIXES android)
  mark_as_advanced(KZ_ANDROID_INCLUDE_DIR KZ_ANDROID_LOG_LIBRARY KZ_ANDROID_UTILS_LIBRARY)
endif()

set(KZ_PLATFORM_LIBRARIES "")
if(KZ_PLATFORM STREQUAL "ndk")
  set(KZ_PLATFORM_LIBRARIES ${KZ_ANDROID_LOG_LIBRARY})
elseif(KZ_PLATFORM STREQUAL "aosp")
  set(KZ_PLATFORM_LIBRARIES ${KZ_ANDROID_LOG_LIBRARY} ${KZ_ANDROID_UTILS_LIBRARY})
endif()

# kz_symbol_map(<variable>): the file that lists the exported names of this build.
function(kz_symbol_map variable)
  set(map "${PROJECT_SOURCE_DIR}/kzsdk/kzsdk.map")
  if(KZ_SMALL_MAP)
    set(map "${PROJECT_SOURCE_DIR}/kzsdk/kzsdk_small.map")
  endif()
  if(NOT KZ_JNI)
    file(READ "${map}" names)
    string(REGEX REPLACE "\n *# jni[^\n]*\n *JNI_OnLoad;(\n *Java_[^\n]*;)*" "" names "${names}")
    set(map "${PROJECT_BINARY_DIR}/kzsdk_without_jni.map")
    file(CONFIGURE OUTPUT "${map}" CONTENT "${names}" @ONLY)
  endif()
  set(${variable} "${map}" PARENT_SCOPE)
endfunction()

if(KZ_JAVA AND NOT KZ_JNI)
  message(FATAL_ERROR "KZ_JAVA builds the Java side of what -DKZ_JNI=OFF leaves out: take -DKZ_JAVA=OFF too")
endif()
if(KZ_JAVA AND NOT (Java_JAVAC_EXECUTABLE AND Java_JAR_EXECUTABLE))
  message(FATAL_ERROR "KZ_JAVA, which builds kzsdk.jar, needs javac and jar of a JDK, and there are none.\n"
                      "Install a JDK (Debian: default-jdk-headless; elsewhere set JAVA_HOME), or build without the "
                      "jar: -DKZ_JAVA=OFF")
endif()

if(KZ_KOTLIN)
  find_program(KZ_KOTLINC kotlinc)
  # Kotlin before 1.8 has a part of its library in a jar of its own.
  find_file(KZ_KOTLIN_LIBRARY kotlin-stdlib-jdk7.jar PATHS /usr/share/java)
  if(NOT KZ_JAVA OR NOT KZ_KOTLINC)
    message(FATAL_ERROR "KZ_KOTLIN, which builds kzsdk-kotlin.jar, needs kotlinc (Debian: kotlin) and -DKZ_JAVA=ON; "
                        "-DKZ_KOTLIN=OFF does without")
  endif()
endif()

# A jar contains when each class was written, unless the tool (of JDK 17 and later) is given a date.
set(KZ_JAR_DATE "")
if(KZ_JAVA)
  execute_process(COMMAND "${Java_JAR_EXECUTABLE}" --help OUTPUT_VARIABLE jar_help ERROR_QUIET)
  if(jar_help MATCHES "--date=")
    set(KZ_JAR_DATE --date=1980-01-01T00:00:02Z)
  endif()
endif()

# kz_jar(<target> OUTPUT <name> SOURCES <files> [CLASSPATH <jars>] [MANIFEST <file>]
#        [FLAGS <flags>])
#
# Compiles for Java 8, warnings being errors, and packs the classes. The jar's path is the target's
# property KZ_JAR.
function(kz_jar target)
  cmake_parse_arguments(PARSE_ARGV 1 jar "" "OUTPUT;MANIFEST" "SOURCES;CLASSPATH;FLAGS")
  set(classes "${CMAKE_CURRENT_BINARY_DIR}/${target}.classes")
  set(output "${CMAKE_CURRENT_BINARY_DIR}/${jar_OUTPUT}")
  if(Java_VERSION VERSION_GREATER_EQUAL 9)
    set(level --release 8)
  else()
    set(level -source 8 -target 8)
  endif()
  set(classpath "")
  if(jar_CLASSPATH)
    string(JOIN ":" classpath ${jar_CLASSPATH})
    set(classpath -classpath "${classpath}")
  endif()
  if(KZ_JAR_DATE)
    set(pack --create --file "${output}" ${KZ_JAR_DATE})
    if(jar_MANIFEST)
      list(APPEND pack --manifest "${jar_MANIFEST}")
    endif()
  elseif(jar_MANIFEST)
    set(pack cfm "${output}" "${jar_MANIFEST}")
  else()
    set(pack cf "${output}")
  endif()
  add_custom_command(
    OUTPUT "${output}"
    COMMAND "${CMAKE_COMMAND}" -E rm -rf "${classes}"
    COMMAND "${CMAKE_COMMAND}" -E make_directory "${classes}"
    COMMAND "${Java_JAVAC_EXECUTABLE}" ${level} -encoding UTF-8 -g -Xlint:all,-options,-serial -Werror
            ${jar_FLAGS} ${classpath} -d "${classes}" ${jar_SOURCES}
    COMMAND "${Java_JAR_EXECUTABLE}" ${pack} -C "${classes}" .
    DEPENDS ${jar_SOURCES} ${jar_CLASSPATH} ${jar_MANIFEST}
    COMMENT "Packing ${jar_OUTPUT}"
    VERBATIM)
  add_custom_target(${target} ALL DEPENDS "${output}")
  set_target_properties(${target} PROPERTIES KZ_JAR "${output}")
endfunction()

# kz_kotlin_jar(<target> OUTPUT <name> SOURCES <files> CLASSPATH <jars>)
#
# The same for Kotlin. Its compiler packs by itself, with the time of day.
function(kz_kotlin_jar target)
  cmake_parse_arguments(PARSE_ARGV 1 jar "" "OUTPUT" "SOURCES;CLASSPATH")
  set(output "${CMAKE_CURRENT_BINARY_DIR}/${jar_OUTPUT}")
  set(classpath ${jar_CLASSPATH})
  if(KZ_KOTLIN_LIBRARY)
    list(APPEND classpath "${KZ_KOTLIN_LIBRARY}")
  endif()
  string(JOIN ":" classpath ${classpath})
  add_custom_command(
    OUTPUT "${output}"
    COMMAND "${KZ_KOTLINC}" -Werror -no-reflect -jvm-target 1.8 -cp "${classpath}" -d "${output}" ${jar_SOURCES}
    DEPENDS ${jar_SOURCES} ${jar_CLASSPATH}
    COMMENT "Packing ${jar_OUTPUT}"
    VERBATIM)
  add_custom_target(${target} ALL DEPENDS "${output}")
  set_target_properties(${target} PROPERTIES KZ_JAR "${output}")
endfunction()

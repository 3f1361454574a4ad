# A program and the package's classes, shrunk together by the package's own keep rules, still find
# the native library's methods and are found by it.
#
#   cmake -D PROGUARD= -D JAVA= -D PROGRAM=program.jar -D JAR=kzsdk.jar -D RULES= -D LIBRARY=
#         -D WORK_DIR= -P shrunk_test.cmake
cmake_minimum_required(VERSION 3.22)

# The shrinker cannot read this JDK's own classes. Without them it would rename what overrides their
# methods: so all names are kept but those of classes, and of what the rules are about.
set(package com.orvanta.android.kzsdk)
file(WRITE "${WORK_DIR}/app.pro"
     "-ignorewarnings
-dontnote **
-dontwarn **
-dontoptimize
-keepattributes *
-keep class Program { public static void main(java.lang.String[]); }
-keepclassmembernames class !${package}.Fingerprint,!${package}.NativeStream { *; }
-keepclassmembernames class ${package}.Fingerprint { public *; protected *; }
")
set(shrunk "${WORK_DIR}/shrunk.jar")
execute_process(
  COMMAND "${PROGUARD}" -injars "${PROGRAM}" -injars "${JAR}(!META-INF/**)" -outjars "${shrunk}" @${WORK_DIR}/app.pro
          @${RULES}
  OUTPUT_VARIABLE log ERROR_VARIABLE log RESULT_VARIABLE result)
if(NOT result EQUAL 0)
  message(FATAL_ERROR "${log}")
endif()

execute_process(
  COMMAND "${JAVA}" -Xcheck:jni "-Dkzsdk.library=${LIBRARY}" -classpath "${shrunk}" Program
  OUTPUT_VARIABLE output ERROR_VARIABLE output)
if(NOT output STREQUAL "the same\n")
  message(FATAL_ERROR "The shrunk program printed:\n${output}")
endif()

# The shrinker did its work: what the program does not use is gone, and the rest is renamed.
file(ARCHIVE_EXTRACT INPUT "${shrunk}" DESTINATION "${WORK_DIR}/shrunk")
file(GLOB_RECURSE classes RELATIVE "${WORK_DIR}/shrunk" "${WORK_DIR}/shrunk/*.class")
list(FILTER classes INCLUDE REGEX "com/orvanta/")
list(FILTER classes EXCLUDE REGEX "[/$][a-z]\\.class$") # names that the shrinker gave
list(SORT classes)
set(expected com/orvanta/android/kzsdk/Fingerprint.class com/orvanta/android/kzsdk/NativeStream.class)
if(NOT classes STREQUAL expected)
  message(FATAL_ERROR "These classes kept their names: ${classes}")
endif()

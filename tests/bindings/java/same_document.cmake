# The desktop example must print what kzfp prints, file by file.
#
#   cmake -D JAVA= -D CLASSPATH= -D LIBRARY= -D KZFP= -D CLIPS= -P same_document.cmake
cmake_minimum_required(VERSION 3.22)

file(GLOB files "${CLIPS}/music-*-s16.wav" "${CLIPS}/music-*-alaw.wav" "${CLIPS}/music-*-ulaw.wav")
list(LENGTH files count)
if(count LESS 10)
  message(FATAL_ERROR "only ${count} clips in ${CLIPS}")
endif()
foreach(file IN LISTS files)
  execute_process(
    COMMAND "${JAVA}" -Xcheck:jni "-Dkzsdk.library=${LIBRARY}" -classpath "${CLASSPATH}"
            FingerprintFile "${file}"
    OUTPUT_VARIABLE from_java COMMAND_ERROR_IS_FATAL ANY)
  execute_process(
    COMMAND "${KZFP}" "${file}"
    OUTPUT_VARIABLE from_kzfp COMMAND_ERROR_IS_FATAL ANY)
  string(STRIP "${from_java}" from_java)
  string(STRIP "${from_kzfp}" from_kzfp)
  if(NOT from_java STREQUAL from_kzfp)
    message(FATAL_ERROR "${file}: Java prints\n${from_java}\nand kzfp\n${from_kzfp}")
  endif()
endforeach()

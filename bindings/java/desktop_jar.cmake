# Adds native libraries to a copy of kzsdk.jar, where BundledLibrary looks for them: a folder for
# each system and processor, and in it, for each library, the list of the files to load in turn.
#
#   cmake -D JAR=kzsdk.jar -D "LIBRARIES=kzsdk=path/libkzsdk.so.1.0.0;..." -D SYSTEM=Linux
#         -D PROCESSOR=x86_64 -D JAR_TOOL=jar -D JAR_DATE=--date=... -D WORK_DIR=scratch
#         -D OUT=kzsdk-desktop.jar -P desktop_jar.cmake
cmake_minimum_required(VERSION 3.22)

string(TOLOWER "${SYSTEM}" system)
string(TOLOWER "${PROCESSOR}" processor)
# As a Java VM calls them.
if(system STREQUAL "darwin")
  set(system macosx)
endif()
if(processor MATCHES "^i[3-6]86$")
  set(processor i386)
elseif(processor MATCHES "^arm[^6]*$")
  set(processor arm)
endif()
set(folder "com/orvanta/android/kzsdk/native/${system}-${processor}")

file(REMOVE_RECURSE "${WORK_DIR}")
file(MAKE_DIRECTORY "${WORK_DIR}/${folder}")
foreach(entry IN LISTS LIBRARIES)
  string(REGEX REPLACE "=.*" "" name "${entry}")
  string(REGEX REPLACE "^[^=]*=" "" library "${entry}")
  get_filename_component(file "${library}" NAME)
  string(REGEX REPLACE "(\\.so)\\..*" "\\1" file "${file}")
  file(COPY_FILE "${library}" "${WORK_DIR}/${folder}/${file}")
  # What it needs is loaded before it, and never looked for around the folder of unpacked files.
  file(RPATH_REMOVE FILE "${WORK_DIR}/${folder}/${file}")
  file(APPEND "${WORK_DIR}/${folder}/${name}.list" "${file}\n")
endforeach()

file(ARCHIVE_EXTRACT INPUT "${JAR}" DESTINATION "${WORK_DIR}")
file(RENAME "${WORK_DIR}/META-INF/MANIFEST.MF" "${WORK_DIR}.manifest")
file(REMOVE_RECURSE "${WORK_DIR}/META-INF")
if(JAR_DATE)
  set(pack --create --file "${OUT}" ${JAR_DATE} --manifest "${WORK_DIR}.manifest")
else()
  set(pack cfm "${OUT}" "${WORK_DIR}.manifest")
endif()
execute_process(COMMAND "${JAR_TOOL}" ${pack} -C "${WORK_DIR}" . COMMAND_ERROR_IS_FATAL ANY)

# Compiles the manifests of the package and of the example app against the resources of Android's
# framework, and packs the app's with the library of the package, as far as that goes without a
# compiler for Android's VM: into an archive without code.
cmake_minimum_required(VERSION 3.22)

function(output_of variable)
  execute_process(COMMAND ${ARGN} OUTPUT_VARIABLE output COMMAND_ERROR_IS_FATAL ANY)
  set(${variable} "${output}" PARENT_SCOPE)
endfunction()

# packed(<variable> <manifest> <raw files> <argument of aapt>...): what a device reads of it.
function(packed variable manifest raw)
  output_of(ignored "${AAPT}" package -f -M "${manifest}" -I "${FRAMEWORK}" -F "${WORK_DIR}/archive.apk" ${ARGN} ${raw})
  output_of(contents "${AAPT}" dump badging "${WORK_DIR}/archive.apk")
  set(${variable} "${contents}" PARENT_SCOPE)
endfunction()

function(expect contents)
  foreach(line IN LISTS ARGN)
    string(FIND "${contents}" "${line}" found)
    if(found EQUAL -1)
      message(SEND_ERROR "no \"${line}\" in\n${contents}")
    endif()
  endforeach()
endfunction()

# gradle_value(<variable> <name>): from the app's build file.
function(gradle_value variable name)
  if(NOT gradle MATCHES "${name} '?([^'\n]+)")
    message(FATAL_ERROR "no ${name} in build.gradle")
  endif()
  set(${variable} "${CMAKE_MATCH_1}" PARENT_SCOPE)
endfunction()

file(REMOVE_RECURSE "${WORK_DIR}")
set(aar "${WORK_DIR}/not_for_devices.aar")
file(MAKE_DIRECTORY "${WORK_DIR}")
output_of(ignored "${CMAKE_COMMAND}" -D "JAR=${JAR}" -D "LIBRARIES=x86_64=${LIBRARY}" -D VERSION=1.0.0 -D NDK=27 -D
          "READELF=${READELF}" -D "WORK_DIR=${WORK_DIR}/scratch" -D "OUT=${aar}" -P "${ROOT}/packaging/aar.cmake")
file(ARCHIVE_EXTRACT INPUT "${aar}" DESTINATION "${WORK_DIR}/aar")
packed(package "${WORK_DIR}/aar/AndroidManifest.xml" "")
expect("${package}" "package: name='com.orvanta.android.kzsdk'" "sdkVersion:'24'")

# The build file has what Gradle puts into the manifest.
set(app "${ROOT}/bindings/android/example/app")
file(READ "${app}/build.gradle" gradle)
gradle_value(id applicationId)
gradle_value(namespace namespace)
gradle_value(least minSdk)
gradle_value(target targetSdk)
file(READ "${app}/src/main/AndroidManifest.xml" manifest)
string(REPLACE "<manifest " "<manifest package=\"${namespace}\" " manifest "${manifest}")
file(WRITE "${WORK_DIR}/app/AndroidManifest.xml" "${manifest}")
file(COPY "${WORK_DIR}/aar/jni/" DESTINATION "${WORK_DIR}/raw/lib")
packed(contents "${WORK_DIR}/app/AndroidManifest.xml" "${WORK_DIR}/raw" --rename-manifest-package "${id}"
       --min-sdk-version "${least}" --target-sdk-version "${target}" -0 so)
expect("${contents}" "package: name='com.example.fingerprint'" "sdkVersion:'24'" "targetSdkVersion:'${target}'"
       "uses-permission: name='android.permission.RECORD_AUDIO'"
       "launchable-activity: name='com.example.fingerprint.MainActivity'" "native-code: 'x86_64'")
if(NOT EXISTS "${app}/src/main/java/com/example/fingerprint/MainActivity.java")
  message(SEND_ERROR "The activity that the manifest names has no source")
endif()

# The library arrives as it was built.
file(ARCHIVE_EXTRACT INPUT "${WORK_DIR}/archive.apk" DESTINATION "${WORK_DIR}/apk")
file(SHA256 "${LIBRARY}" built)
file(SHA256 "${WORK_DIR}/apk/lib/x86_64/libkzsdk.so" arrived)
if(NOT built STREQUAL arrived)
  message(SEND_ERROR "lib/x86_64/libkzsdk.so is not ${LIBRARY}")
endif()

# Puts the page together: its own files, below kzsdk/ what it needs of the package, and beside each
# file that becomes smaller by it a compressed one. Files that belong to neither are removed.
#
#   cmake -DSOURCE=... -DPACKAGE=... -DPAGE=... [-DGZIP=...] -P assemble.cmake
cmake_minimum_required(VERSION 3.22)

file(GLOB own RELATIVE "${SOURCE}" "${SOURCE}/*.html" "${SOURCE}/*.css" "${SOURCE}/*.svg"
     "${SOURCE}/*.webmanifest" "${SOURCE}/app/*.js")
file(GLOB packaged RELATIVE "${PACKAGE}" "${PACKAGE}/*.js" "${PACKAGE}/*.mjs" "${PACKAGE}/*.wasm")
if(NOT own OR NOT packaged)
  message(FATAL_ERROR "Nothing to put together in ${SOURCE} or ${PACKAGE}: build the target kz_wasm first")
endif()

set(kept "")

# put(<file> <name below the page>)
function(put file name)
  get_filename_component(folder "${PAGE}/${name}" DIRECTORY)
  file(MAKE_DIRECTORY "${folder}")
  file(COPY_FILE "${file}" "${PAGE}/${name}" ONLY_IF_DIFFERENT)
  set(files "${name}")
  if(GZIP)
    set(small "${PAGE}/${name}.gz")
    if("${PAGE}/${name}" IS_NEWER_THAN "${small}")
      # Without name and time, so that the same bytes come out every time. What was interrupted must
      # not pass for finished: it would be newer than the file, and never made again.
      execute_process(COMMAND "${GZIP}" -9 -n -c "${PAGE}/${name}" OUTPUT_FILE "${small}.part"
                      COMMAND_ERROR_IS_FATAL ANY)
      file(RENAME "${small}.part" "${small}")
    endif()
    list(APPEND files "${name}.gz")
  endif()
  set(kept ${kept} ${files} PARENT_SCOPE)
endfunction()

foreach(name IN LISTS own)
  put("${SOURCE}/${name}" "${name}")
endforeach()
foreach(name IN LISTS packaged)
  put("${PACKAGE}/${name}" "kzsdk/${name}")
endforeach()

file(GLOB_RECURSE present RELATIVE "${PAGE}" "${PAGE}/*")
foreach(name IN LISTS present)
  if(NOT name IN_LIST kept)
    file(REMOVE "${PAGE}/${name}")
  endif()
endforeach()

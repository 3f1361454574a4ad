# What a build takes if it is there.

# kz_optional_packages(<user> <option> <prefix> <name> <Debian packages> <pkg-config module>...)
#
# Sets <prefix>_FOUND for the packages of an option that is AUTO, ON or OFF: AUTO takes what is
# found; ON stops without it. The user is what does without them otherwise.
function(kz_optional_packages user option prefix name debian)
  set(${option} AUTO CACHE STRING "${name}: AUTO, ON or OFF")
  set_property(CACHE ${option} PROPERTY STRINGS AUTO ON OFF)
  string(TOUPPER "${${option}}" wanted)
  set(found FALSE)
  if(NOT wanted STREQUAL "AUTO" AND "${wanted}" MATCHES "^(OFF|NO|FALSE|0)$")
    message(STATUS "${user} without ${name}: ${option} is OFF")
  else()
    pkg_check_modules(${prefix} QUIET IMPORTED_TARGET GLOBAL ${ARGN})
    set(found ${${prefix}_FOUND})
    if(NOT found AND NOT wanted STREQUAL "AUTO")
      message(FATAL_ERROR "${option} is ON, and pkg-config did not find ${name}.\nInstall it (Debian: ${debian}), or "
                          "build without it: -D${option}=OFF")
    elseif(NOT found)
      message(STATUS "${user} without ${name}, which was not found (Debian: ${debian})")
    endif()
  endif()
  set(${prefix}_FOUND ${found} PARENT_SCOPE)
endfunction()

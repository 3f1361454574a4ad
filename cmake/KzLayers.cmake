# Which folder may see which, and which room of the library lies above which. Declared once, here
# and in each room's CMakeLists.txt; kz_write_layers() writes it to layers.txt in the build folder,
# from which tests/whole/layers and scripts/mutate.py read it.

# kz_house(<folder> [PUBLIC <folder>...] [SEES <folder>...] [INSIDE <folder>...])
#
# A top-level folder of sources, and what it may include besides itself: of the folders after PUBLIC
# only the public headers (.h); of those after SEES the private headers (.hpp) too, but of a room
# that has a DOOR only what that names; of those after INSIDE everything.
function(kz_house folder)
  cmake_parse_arguments(PARSE_ARGV 1 house "" "" "PUBLIC;SEES;INSIDE")
  list(JOIN house_PUBLIC "," public)
  list(JOIN house_SEES "," sees)
  list(JOIN house_INSIDE "," inside)
  set_property(GLOBAL APPEND PROPERTY KZ_LAYERS "house ${folder} public=${public} sees=${sees} inside=${inside}")
endfunction()

# kz_room(<name> [IF <condition>] [BELOW <room>...] [DOOR <header>...] [HEADERS <header>...]
#         SOURCES <file>...)
#
# A room of the library becomes an object library. A room sees, and its tests link, only what is
# named in BELOW and what lies below that: a call upwards does not link. HEADERS are public. Where
# DOOR is given, other rooms include only the headers that it names. Where the variable after IF is
# false the room is declared, so that its rules hold, but not built.
function(kz_room name)
  cmake_parse_arguments(PARSE_ARGV 1 room "" "IF" "BELOW;DOOR;HEADERS;SOURCES")
  set(closure ${name})
  foreach(below IN LISTS room_BELOW)
    get_property(lower GLOBAL PROPERTY KZ_ROOM_${below}_CLOSURE)
    if(NOT lower)
      message(FATAL_ERROR "kz_room(${name}): ${below} is not declared before it; kzsdk/CMakeLists.txt lists the "
                          "rooms, lowest first")
    endif()
    list(APPEND closure ${lower})
  endforeach()
  list(REMOVE_DUPLICATES closure)
  set_property(GLOBAL PROPERTY KZ_ROOM_${name}_CLOSURE ${closure})
  kz_record_room(${name})
  if(room_IF AND NOT ${room_IF})
    return()
  endif()
  kz_library_objects(kz_${name} ${room_SOURCES})
  set_property(GLOBAL APPEND PROPERTY KZ_ROOMS ${name})
  list(TRANSFORM room_HEADERS PREPEND "${CMAKE_CURRENT_SOURCE_DIR}/")
  set_property(GLOBAL APPEND PROPERTY KZ_PUBLIC_HEADERS ${room_HEADERS})
endfunction()

# The rest of kz_room(), whose variables it reads: the line of layers.txt.
function(kz_record_room name)
  set(below ${closure})
  list(REMOVE_ITEM below ${name})
  list(TRANSFORM below PREPEND "kzsdk/")
  list(JOIN below "," below)
  list(JOIN room_DOOR "," door)
  list(JOIN room_HEADERS "," headers)
  set_property(GLOBAL APPEND PROPERTY KZ_LAYERS "room kzsdk/${name} below=${below} door=${door} headers=${headers}")
endfunction()

# kz_room_closure(<variable> <room>...): these rooms and all below them.
function(kz_room_closure variable)
  set(rooms "")
  foreach(name IN LISTS ARGN)
    get_property(closure GLOBAL PROPERTY KZ_ROOM_${name}_CLOSURE)
    list(APPEND rooms ${closure})
  endforeach()
  list(REMOVE_DUPLICATES rooms)
  set(${variable} ${rooms} PARENT_SCOPE)
endfunction()

# kz_room_objects(<variable> <room>...): the object libraries of these rooms and of all below them.
function(kz_room_objects variable)
  kz_room_closure(rooms ${ARGN})
  list(TRANSFORM rooms PREPEND "kz_")
  set(${variable} ${rooms} PARENT_SCOPE)
endfunction()

# kz_record_test(<target> <room>...): a test program of this folder, and the rooms whose code it
# runs.
function(kz_record_test target)
  set(rooms ${ARGN})
  list(FILTER rooms EXCLUDE REGEX "^platform_")
  list(TRANSFORM rooms PREPEND "kzsdk/")
  list(JOIN rooms "," rooms)
  cmake_path(RELATIVE_PATH CMAKE_CURRENT_BINARY_DIR BASE_DIRECTORY "${PROJECT_BINARY_DIR}" OUTPUT_VARIABLE place)
  set_property(GLOBAL APPEND PROPERTY KZ_LAYERS "test ${place}/${target} rooms=${rooms}")
endfunction()

# Writes what was declared, once all is.
function(kz_write_layers)
  get_property(lines GLOBAL PROPERTY KZ_LAYERS)
  list(JOIN lines "\n" lines)
  file(CONFIGURE OUTPUT "${PROJECT_BINARY_DIR}/layers.txt" CONTENT "${lines}\n" @ONLY)
endfunction()

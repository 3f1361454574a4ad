# Which folder may see which, and which room of a library lies above which. Declared once, here and
# in each room's CMakeLists.txt; kz_write_layers() writes it to layers.txt in the build folder,
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
#         [LIBS <target>...] SOURCES <file>...)
#
# A room of a library becomes an object library, kz_<name> for those of kzsdk and kzcat_<name> for
# those of the catalogue. A room sees, and its tests link, only what is named in BELOW and what lies
# below that: a call upwards does not link. HEADERS are public. Where DOOR is given, other rooms
# include only the headers that it names. LIBS are other libraries that it uses. Where the variable
# after IF is false the room is declared, so that its rules hold, but not built.
#
# A room is named by its house and its name, as kzsdk/dsp, or by its name alone if it is kzsdk's. It
# lies in the folder of its name, unless its house's own folder holds its files.
function(kz_room name)
  cmake_parse_arguments(PARSE_ARGV 1 room "" "IF" "BELOW;DOOR;HEADERS;LIBS;SOURCES")
  cmake_path(RELATIVE_PATH CMAKE_CURRENT_SOURCE_DIR BASE_DIRECTORY "${PROJECT_SOURCE_DIR}" OUTPUT_VARIABLE folder)
  kz_house_of(house ${folder})
  set(room ${house}/${name})
  set(closure ${room})
  foreach(below IN LISTS room_BELOW)
    get_property(lower GLOBAL PROPERTY KZ_ROOM_${house}/${below}_CLOSURE)
    if(NOT lower)
      message(FATAL_ERROR "kz_room(${name}): ${below} is not declared before it; ${house}/CMakeLists.txt lists the "
                          "rooms, lowest first")
    endif()
    list(APPEND closure ${lower})
  endforeach()
  list(REMOVE_DUPLICATES closure)
  set_property(GLOBAL PROPERTY KZ_ROOM_${room}_CLOSURE ${closure})
  set_property(GLOBAL PROPERTY KZ_ROOM_${room}_FOLDER ${folder})
  kz_record_room()
  if((room_IF AND NOT ${room_IF}) OR (house STREQUAL "catalogue" AND NOT KZ_BUILD_CATALOGUE))
    return()
  endif()
  kz_build_room()
endfunction()

# The rest of kz_room(), whose variables it reads: the object library.
macro(kz_build_room)
  if(house STREQUAL "catalogue")
    set(target kzcat_${name})
    kz_objects(${target} ${room_SOURCES})
    # For what links the room's objects alone: tests, benchmarks, fuzz targets.
    target_link_libraries(${target} PUBLIC kzsdk_static ${room_LIBS})
    target_include_directories(${target} PUBLIC "${PROJECT_SOURCE_DIR}/catalogue")
  else()
    set(target kz_${name})
    kz_library_objects(${target} ${room_SOURCES})
  endif()
  set_property(GLOBAL PROPERTY KZ_ROOM_${room}_TARGET ${target})
  set_property(GLOBAL APPEND PROPERTY KZ_ROOMS_OF_${house} ${room})
  set_property(GLOBAL APPEND PROPERTY KZ_LIBS_OF_${house} ${room_LIBS})
  list(TRANSFORM room_HEADERS PREPEND "${CMAKE_CURRENT_SOURCE_DIR}/")
  set_property(GLOBAL APPEND PROPERTY KZ_PUBLIC_HEADERS_OF_${house} ${room_HEADERS})
endmacro()

# The rest of kz_room(), whose variables it reads: the line of layers.txt.
function(kz_record_room)
  list(REMOVE_ITEM closure ${room})
  kz_room_folders(below ${closure})
  list(JOIN below "," below)
  list(JOIN room_DOOR "," door)
  list(JOIN room_HEADERS "," headers)
  set_property(GLOBAL APPEND PROPERTY KZ_LAYERS "room ${folder} below=${below} door=${door} headers=${headers}")
endfunction()

# kz_house_of(<variable> <path>): the first part of a path, such as kzsdk.
function(kz_house_of variable path)
  string(REGEX MATCH "^[^/]+" house "${path}")
  set(${variable} ${house} PARENT_SCOPE)
endfunction()

# kz_mirrored_room(<room> <prefix>): the room that this folder of tests mirrors, and how the names
# of its targets begin. A folder of tests that mirrors none has its own name for both.
function(kz_mirrored_room room prefix)
  cmake_path(RELATIVE_PATH CMAKE_CURRENT_SOURCE_DIR BASE_DIRECTORY "${PROJECT_SOURCE_DIR}/tests" OUTPUT_VARIABLE path)
  cmake_path(GET path FILENAME folder)
  set(targets ${folder})
  if(path MATCHES "^catalogue")
    set(folder ${path})
    string(REGEX REPLACE "^catalogue" "kzcat" targets "${path}")
    string(REPLACE "/" "_" targets "${targets}")
  endif()
  set(${room} ${folder} PARENT_SCOPE)
  set(${prefix} ${targets} PARENT_SCOPE)
endfunction()

# kz_room_folders(<variable> <room>...): where they lie, from the root.
function(kz_room_folders variable)
  set(folders "")
  foreach(room IN LISTS ARGN)
    get_property(folder GLOBAL PROPERTY KZ_ROOM_${room}_FOLDER)
    list(APPEND folders ${folder})
  endforeach()
  set(${variable} ${folders} PARENT_SCOPE)
endfunction()

# kz_room_closure(<variable> <room>...): these rooms and all below them.
function(kz_room_closure variable)
  set(rooms "")
  foreach(name IN LISTS ARGN)
    if(NOT name MATCHES "/")
      set(name kzsdk/${name})
    endif()
    get_property(closure GLOBAL PROPERTY KZ_ROOM_${name}_CLOSURE)
    if(NOT closure)
      message(FATAL_ERROR "there is no room ${name}")
    endif()
    list(APPEND rooms ${closure})
  endforeach()
  list(REMOVE_DUPLICATES rooms)
  set(${variable} ${rooms} PARENT_SCOPE)
endfunction()

# kz_room_objects(<variable> <room>...): the object libraries of these rooms and of all below them.
function(kz_room_objects variable)
  kz_room_closure(rooms ${ARGN})
  set(targets "")
  foreach(room IN LISTS rooms)
    get_property(target GLOBAL PROPERTY KZ_ROOM_${room}_TARGET)
    list(APPEND targets ${target})
  endforeach()
  set(${variable} ${targets} PARENT_SCOPE)
endfunction()

# kz_add_objects(<library> <house>): the objects of all rooms of the house. They go in as sources,
# not as linked targets: what is installed has no rooms.
function(kz_add_objects library house)
  get_property(rooms GLOBAL PROPERTY KZ_ROOMS_OF_${house})
  foreach(room IN LISTS rooms)
    get_property(target GLOBAL PROPERTY KZ_ROOM_${room}_TARGET)
    target_sources(${library} PRIVATE $<TARGET_OBJECTS:${target}>)
  endforeach()
endfunction()

# kz_record_test(<target> <room>...): a test program of this folder, and the rooms whose code it
# runs.
function(kz_record_test target)
  kz_room_folders(rooms ${ARGN})
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

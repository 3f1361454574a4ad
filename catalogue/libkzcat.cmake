# libkzcat, shared and static, of all rooms' objects. It has a version of its own, which its header
# states.
file(STRINGS kzcat.h version REGEX "define KZCAT_VERSION ")
string(REGEX MATCH "[0-9]+\\.[0-9]+\\.[0-9]+" KZCAT_VERSION "${version}")
string(REGEX MATCH "^[0-9]+" soversion "${KZCAT_VERSION}")
set(KZCAT_VERSION ${KZCAT_VERSION} PARENT_SCOPE)

get_property(libraries GLOBAL PROPERTY KZ_LIBS_OF_catalogue)
list(REMOVE_DUPLICATES libraries)

add_library(kzcat_shared SHARED)
add_library(kzcat_static STATIC)
foreach(library kzcat_shared kzcat_static)
  kz_add_objects(${library} catalogue)
  # Programs write "kzcat.h", in the tree and once it is installed.
  target_include_directories(
    ${library} INTERFACE "$<BUILD_INTERFACE:${PROJECT_SOURCE_DIR}/catalogue>"
                         "$<INSTALL_INTERFACE:${CMAKE_INSTALL_INCLUDEDIR}>")
  set_target_properties(${library} PROPERTIES OUTPUT_NAME kzcat)
endforeach()
set_target_properties(
  kzcat_shared PROPERTIES LINKER_LANGUAGE CXX EXPORT_NAME kzcat VERSION ${KZCAT_VERSION}
                          SOVERSION ${soversion})
# It finds the other library beside itself, wherever both are installed.
set_target_properties(kzcat_shared PROPERTIES BUILD_RPATH_USE_ORIGIN ON INSTALL_RPATH "$ORIGIN")
foreach(library IN LISTS libraries)
  target_link_libraries(kzcat_shared PRIVATE $<BUILD_INTERFACE:${library}>)
endforeach()
target_link_libraries(kzcat_shared PUBLIC kzsdk_shared PRIVATE $<BUILD_INTERFACE:kz_settings> m)

# A program in C links the C++ run-time library by its name.
set(cxx ${CMAKE_CXX_IMPLICIT_LINK_LIBRARIES})
list(FILTER cxx INCLUDE REGEX "^(std)?c\\+\\+$")
list(TRANSFORM cxx PREPEND "-l" OUTPUT_VARIABLE flags)
list(JOIN flags " " KZCAT_CXX_FLAGS)
set(KZCAT_CXX_FLAGS ${KZCAT_CXX_FLAGS} PARENT_SCOPE)
set_target_properties(kzcat_static PROPERTIES LINKER_LANGUAGE C)
target_link_libraries(kzcat_static INTERFACE kzsdk_static ${libraries} ${cxx} m)

set(map "${CMAKE_CURRENT_SOURCE_DIR}/kzcat.map")
set_target_properties(kzcat_shared PROPERTIES KZ_SYMBOL_MAP "${map}" LINK_DEPENDS "${map}")
target_link_options(
  kzcat_shared PRIVATE "-Wl,--version-script=${map}" -Wl,-Bsymbolic-functions -Wl,--as-needed
  -Wl,-z,max-page-size=16384)
if(NOT KZ_SANITIZE)
  target_link_options(kzcat_shared PRIVATE -Wl,-z,defs)
endif()

add_library(kzcat::kzcat ALIAS kzcat_shared)
add_library(kzcat::kzcat_static ALIAS kzcat_static)

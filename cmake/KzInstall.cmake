# What `cmake --install` puts where: the libraries, the public headers, what find_package and
# pkg-config look for, and the licence. The command-line program installs itself.
include(CMakePackageConfigHelpers)

install(
  TARGETS kzsdk_shared kzsdk_static
  EXPORT kzsdkTargets
  ARCHIVE DESTINATION "${CMAKE_INSTALL_LIBDIR}"
  LIBRARY DESTINATION "${CMAKE_INSTALL_LIBDIR}"
  RUNTIME DESTINATION "${CMAKE_INSTALL_BINDIR}"
  INCLUDES DESTINATION "${CMAKE_INSTALL_INCLUDEDIR}")

# Headers keep their place below kzsdk/, so that one spelling of an include serves in the tree and
# out of it.
get_property(public_headers GLOBAL PROPERTY KZ_PUBLIC_HEADERS_OF_kzsdk)
foreach(header IN LISTS public_headers ITEMS "${PROJECT_SOURCE_DIR}/kzsdk/kzsdk.h")
  cmake_path(RELATIVE_PATH header BASE_DIRECTORY "${PROJECT_SOURCE_DIR}" OUTPUT_VARIABLE place)
  cmake_path(GET place PARENT_PATH place)
  install(FILES "${header}" DESTINATION "${CMAKE_INSTALL_INCLUDEDIR}/${place}")
endforeach()

# The header for C++, beside the one in C that includes all.
install(FILES "${PROJECT_SOURCE_DIR}/kzsdk/kzsdk.hpp" DESTINATION "${CMAKE_INSTALL_INCLUDEDIR}/kzsdk")

# kz_install_package(<name> <version> <export set>...): what find_package(<name>) reads.
function(kz_install_package name version)
  set(package_dir "${CMAKE_INSTALL_LIBDIR}/cmake/${name}")
  foreach(set IN LISTS ARGN)
    install(
      EXPORT ${set}
      NAMESPACE ${name}::
      DESTINATION "${package_dir}")
  endforeach()
  configure_package_config_file(
    "${PROJECT_SOURCE_DIR}/packaging/${name}Config.cmake.in" "${PROJECT_BINARY_DIR}/${name}Config.cmake"
    INSTALL_DESTINATION "${package_dir}" NO_SET_AND_CHECK_MACRO)
  write_basic_package_version_file("${PROJECT_BINARY_DIR}/${name}ConfigVersion.cmake" VERSION ${version}
                                   COMPATIBILITY SameMajorVersion)
  install(FILES "${PROJECT_BINARY_DIR}/${name}Config.cmake"
                "${PROJECT_BINARY_DIR}/${name}ConfigVersion.cmake" DESTINATION "${package_dir}")
endfunction()

kz_install_package(kzsdk ${PROJECT_VERSION} kzsdkTargets)

# pkg-config: the file finds its prefix from its own place, so an installed tree can be moved.
set(pkgconfig_dir "${CMAKE_INSTALL_LIBDIR}/pkgconfig")
if(IS_ABSOLUTE "${CMAKE_INSTALL_LIBDIR}" OR IS_ABSOLUTE "${CMAKE_INSTALL_INCLUDEDIR}")
  set(KZ_PC_PREFIX "${CMAKE_INSTALL_PREFIX}")
  set(KZ_PC_LIBDIR "${CMAKE_INSTALL_FULL_LIBDIR}")
  set(KZ_PC_INCLUDEDIR "${CMAKE_INSTALL_FULL_INCLUDEDIR}")
else()
  file(RELATIVE_PATH up "/prefix/${pkgconfig_dir}" "/prefix")
  string(REGEX REPLACE "/$" "" up "${up}")
  set(KZ_PC_PREFIX "\${pcfiledir}/${up}")
  set(KZ_PC_LIBDIR "\${prefix}/${CMAKE_INSTALL_LIBDIR}")
  set(KZ_PC_INCLUDEDIR "\${prefix}/${CMAKE_INSTALL_INCLUDEDIR}")
endif()
configure_file("${PROJECT_SOURCE_DIR}/packaging/kzsdk.pc.in" "${PROJECT_BINARY_DIR}/kzsdk.pc" @ONLY)
install(FILES "${PROJECT_BINARY_DIR}/kzsdk.pc" DESTINATION "${pkgconfig_dir}")

# The catalogue, with its one header beside the folder of the other library's. What a program needs
# that links it statically is in an export set of its own: others need no SQLite to build with.
if(KZ_BUILD_KZCAT)
  install(
    TARGETS kzcat_shared
    EXPORT kzcatTargets
    LIBRARY DESTINATION "${CMAKE_INSTALL_LIBDIR}"
    RUNTIME DESTINATION "${CMAKE_INSTALL_BINDIR}")
  install(
    TARGETS kzcat_static
    EXPORT kzcatStaticTargets
    ARCHIVE DESTINATION "${CMAKE_INSTALL_LIBDIR}")
  install(FILES "${PROJECT_SOURCE_DIR}/catalogue/kzcat.h" "${PROJECT_SOURCE_DIR}/catalogue/kzcat.hpp"
          DESTINATION "${CMAKE_INSTALL_INCLUDEDIR}")
  kz_install_package(kzcat ${KZCAT_VERSION} kzcatTargets kzcatStaticTargets)
  configure_file("${PROJECT_SOURCE_DIR}/packaging/kzcat.pc.in" "${PROJECT_BINARY_DIR}/kzcat.pc" @ONLY)
  install(FILES "${PROJECT_BINARY_DIR}/kzcat.pc" DESTINATION "${pkgconfig_dir}")
  install(FILES "${PROJECT_SOURCE_DIR}/examples/recognise.c" "${PROJECT_SOURCE_DIR}/examples/recognise.cpp"
          DESTINATION "${CMAKE_INSTALL_DOCDIR}/examples")
endif()

install(FILES "${PROJECT_SOURCE_DIR}/LICENSE" DESTINATION "${CMAKE_INSTALL_DOCDIR}")
install(FILES "${PROJECT_SOURCE_DIR}/examples/fingerprint_tune.c"
        DESTINATION "${CMAKE_INSTALL_DOCDIR}/examples")

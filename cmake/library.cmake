# libtuvosharing: its object files (the tests link these, to reach the private classes) and the
# shared library made of them, with its pkg-config file and CMake package.
file(GLOB library_sources CONFIGURE_DEPENDS "${PROJECT_SOURCE_DIR}/utils/*.cpp"
     "${PROJECT_SOURCE_DIR}/db/*.cpp" "${PROJECT_SOURCE_DIR}/record/*.cpp"
     "${PROJECT_SOURCE_DIR}/login/*.cpp")
add_library(tuvosharing_objects OBJECT ${library_sources})
target_include_directories(tuvosharing_objects PUBLIC "${PROJECT_SOURCE_DIR}/include")
target_link_libraries(
  tuvosharing_objects
  PUBLIC tuvo_platform PkgConfig::JSONCPP
  PRIVATE tuvo_options PkgConfig::SQLITE3 ${CMAKE_DL_LIBS})

# The digests' libraries are loaded when a digest is made (include/internal/late_library.h), so only
# their headers and names are needed here.
find_library(GCRYPT_LIBRARY gcrypt HINTS ${LIBGCRYPT_LIBRARY_DIRS} REQUIRED)
tuvo_soname(libgcrypt_soname "${GCRYPT_LIBRARY}")
tuvo_soname(libcrypto_soname "${OPENSSL_CRYPTO_LIBRARY}")
target_include_directories(tuvosharing_objects SYSTEM PRIVATE ${LIBGCRYPT_INCLUDE_DIRS}
                                                              ${OPENSSL_INCLUDE_DIR})
set_source_files_properties(
  "${PROJECT_SOURCE_DIR}/utils/password_hash.cpp"
  PROPERTIES
    COMPILE_DEFINITIONS
    "TUVO_LIBCRYPTO_SONAME=\"${libcrypto_soname}\";TUVO_LIBGCRYPT_SONAME=\"${libgcrypt_soname}\"")

set(version_script "${PROJECT_SOURCE_DIR}/cmake/tuvosharing.map")
add_library(tuvosharing SHARED $<TARGET_OBJECTS:tuvosharing_objects>)
add_library(tuvosharing::tuvosharing ALIAS tuvosharing)
# The number is the binary interface's own, not the release's.
set_target_properties(tuvosharing PROPERTIES VERSION 7 SOVERSION 7 LINK_DEPENDS
                                                                   "${version_script}")
target_include_directories(
  tuvosharing INTERFACE "$<BUILD_INTERFACE:${PROJECT_SOURCE_DIR}/include>"
                        "$<INSTALL_INTERFACE:${CMAKE_INSTALL_INCLUDEDIR}>")
target_link_libraries(
  tuvosharing
  PUBLIC PkgConfig::JSONCPP
  PRIVATE tuvo_options tuvo_platform PkgConfig::SQLITE3 ${CMAKE_DL_LIBS})
# The library's calls of its own exported functions need no look-up at every start.
target_link_options(tuvosharing PRIVATE "-Wl,--version-script=${version_script}"
                                        -Wl,-Bsymbolic-functions)

configure_package_config_file(
  "${PROJECT_SOURCE_DIR}/cmake/tuvosharing-config.cmake.in" tuvosharing-config.cmake
  INSTALL_DESTINATION "${CMAKE_INSTALL_LIBDIR}/cmake/tuvosharing")
write_basic_package_version_file(tuvosharing-config-version.cmake COMPATIBILITY SameMinorVersion)

install(TARGETS tuvosharing EXPORT tuvosharing LIBRARY DESTINATION "${CMAKE_INSTALL_LIBDIR}")
install(
  EXPORT tuvosharing
  NAMESPACE tuvosharing::
  FILE tuvosharing-targets.cmake
  DESTINATION "${CMAKE_INSTALL_LIBDIR}/cmake/tuvosharing")
install(FILES "${PROJECT_BINARY_DIR}/tuvosharing-config.cmake"
              "${PROJECT_BINARY_DIR}/tuvosharing-config-version.cmake"
        DESTINATION "${CMAKE_INSTALL_LIBDIR}/cmake/tuvosharing")
tuvo_pkg_config(tuvosharing)
install(DIRECTORY "${PROJECT_SOURCE_DIR}/include/tuvosharing"
        DESTINATION "${CMAKE_INSTALL_INCLUDEDIR}")
file(GLOB pages CONFIGURE_DEPENDS "${PROJECT_SOURCE_DIR}/packaging/man/*.3")
install(FILES ${pages} DESTINATION "${CMAKE_INSTALL_MANDIR}/man3")
install(FILES "${PROJECT_SOURCE_DIR}/schema/1.sql" "${PROJECT_SOURCE_DIR}/schema/2.sql"
        DESTINATION share/tuvosharing/db_schema)

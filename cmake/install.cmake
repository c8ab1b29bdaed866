# The library with its headers, a CMake package and a pkg-config file.
include(GNUInstallDirs)
include(CMakePackageConfigHelpers)

set(QV_INCLUDE_ROOT ${CMAKE_INSTALL_INCLUDEDIR}/qvplugcore)

install(TARGETS qvplugcore EXPORT qvplugcore-targets LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR})
install(DIRECTORY ${CMAKE_SOURCE_DIR}/core DESTINATION ${QV_INCLUDE_ROOT}
        FILES_MATCHING PATTERN "*.h" PATTERN "posix" EXCLUDE PATTERN "*_p.h" EXCLUDE)
install(FILES ${CMAKE_SOURCE_DIR}/plugins/wire.h DESTINATION ${QV_INCLUDE_ROOT}/plugins)
install(FILES ${CMAKE_BINARY_DIR}/include/qvplugcore/qvplugcore.h DESTINATION ${QV_INCLUDE_ROOT})

# A header that has moved is still found under its former name.
file(STRINGS ${CMAKE_SOURCE_DIR}/cmake/formerheaders.txt QV_FORMER_HEADERS REGEX "^core/")
foreach(row ${QV_FORMER_HEADERS})
  string(REGEX MATCH "^([^ ]+) +([^ ]+)$" row "${row}")
  file(CONFIGURE OUTPUT ${CMAKE_BINARY_DIR}/former/${CMAKE_MATCH_1}
       CONTENT "// Its place is ${CMAKE_MATCH_2} now.\n#pragma once\n\n#include \"${CMAKE_MATCH_2}\"\n")
endforeach()
install(DIRECTORY ${CMAKE_BINARY_DIR}/former/core DESTINATION ${QV_INCLUDE_ROOT})
install(DIRECTORY ${CMAKE_SOURCE_DIR}/docs/ DESTINATION ${CMAKE_INSTALL_DOCDIR} FILES_MATCHING PATTERN "*.md")
install(EXPORT qvplugcore-targets DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/qvplugcore)

file(WRITE ${CMAKE_BINARY_DIR}/qvplugcore-config.cmake
     "include(\"\${CMAKE_CURRENT_LIST_DIR}/qvplugcore-targets.cmake\")\n")
write_basic_package_version_file(${CMAKE_BINARY_DIR}/qvplugcore-config-version.cmake
                                 COMPATIBILITY SameMajorVersion)
install(FILES ${CMAKE_BINARY_DIR}/qvplugcore-config.cmake ${CMAKE_BINARY_DIR}/qvplugcore-config-version.cmake
        DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/qvplugcore)

file(RELATIVE_PATH QV_PC_UP /${CMAKE_INSTALL_LIBDIR}/pkgconfig /)
configure_file(${CMAKE_SOURCE_DIR}/cmake/qvplugcore.pc.in ${CMAKE_BINARY_DIR}/qvplugcore.pc @ONLY)
install(FILES ${CMAKE_BINARY_DIR}/qvplugcore.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)

install(FILES ${CMAKE_SOURCE_DIR}/CHANGELOG.md ${CMAKE_SOURCE_DIR}/docs/progress.schema.json
        DESTINATION ${CMAKE_INSTALL_DOCDIR})

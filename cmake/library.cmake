# One set of objects makes the shared library and, for unit tests of what is not exported, a static one.
file(GLOB_RECURSE QV_SOURCES CONFIGURE_DEPENDS
     ${CMAKE_SOURCE_DIR}/core/*.cpp ${CMAKE_SOURCE_DIR}/builtin/*.cpp)

include(cmake/soundbytes.cmake)
add_library(qv_objects OBJECT ${QV_SOURCES})
add_dependencies(qv_objects qv_sounds)
target_include_directories(qv_objects PRIVATE ${CMAKE_BINARY_DIR}/generated)
target_compile_definitions(qv_objects PRIVATE QV_BUILDING_LIBRARY)
target_include_directories(qv_objects PUBLIC ${CMAKE_SOURCE_DIR})
target_link_libraries(qv_objects PUBLIC
  Threads::Threads ZLIB::ZLIB PNG::PNG EXPAT::EXPAT Freetype::Freetype
  PkgConfig::DEFLATE PkgConfig::FONTCONFIG PkgConfig::HARFBUZZ PkgConfig::FRIBIDI PkgConfig::UNIBREAK PkgConfig::UCHARDET
  PkgConfig::CRYPTOPP PkgConfig::HWY PkgConfig::EBUR128
  ${CMAKE_DL_LIBS})
if(SOXR_FOUND)
  target_link_libraries(qv_objects PUBLIC PkgConfig::SOXR)
  set_source_files_properties(${CMAKE_SOURCE_DIR}/builtin/sound/format/soxrrate.cpp PROPERTIES
                              COMPILE_DEFINITIONS QV_HAVE_SOXR)
endif()

qv_precompile(qv_objects <algorithm> <functional> <memory> <string> <vector>
              ${CMAKE_SOURCE_DIR}/core/value/anycontainer.h)

# <qvplugcore/qvplugcore.h> includes every public header, room by room from the ground up.
file(STRINGS ${CMAKE_SOURCE_DIR}/tests/lint/rooms.txt QV_ROOMS REGEX "^ *[0-9]+ +core/")
set(QV_UMBRELLA "// The whole public interface of the engine.\n#pragma once\n\n")
foreach(room ${QV_ROOMS})
  string(REGEX REPLACE "^ *[0-9]+ +([^ ]+).*" "\\1" room "${room}")
  file(GLOB headers RELATIVE ${CMAKE_SOURCE_DIR} CONFIGURE_DEPENDS ${CMAKE_SOURCE_DIR}/${room}/*.h)
  list(FILTER headers EXCLUDE REGEX "_p\\.h$")
  foreach(header ${headers})
    string(APPEND QV_UMBRELLA "#include \"${header}\"\n")
  endforeach()
endforeach()
file(CONFIGURE OUTPUT ${CMAKE_BINARY_DIR}/include/qvplugcore/qvplugcore.h CONTENT "${QV_UMBRELLA}" @ONLY)

add_library(qvplugcore SHARED $<TARGET_OBJECTS:qv_objects>)
target_link_libraries(qvplugcore PRIVATE qv_objects)
# Instances of the standard library's templates are visible by their own declaration; they are not ours to export.
if(NOT QV_SANITIZE)
  target_link_options(qvplugcore PRIVATE -Wl,--version-script=${CMAKE_SOURCE_DIR}/cmake/exports.map -Wl,--no-undefined)
  set_target_properties(qvplugcore PROPERTIES LINK_DEPENDS ${CMAKE_SOURCE_DIR}/cmake/exports.map)
endif()
set_target_properties(qvplugcore PROPERTIES VERSION ${PROJECT_VERSION} SOVERSION ${PROJECT_VERSION_MAJOR})
target_compile_features(qvplugcore INTERFACE cxx_std_20)  # of its headers
target_include_directories(qvplugcore INTERFACE
  $<BUILD_INTERFACE:${CMAKE_SOURCE_DIR}> $<BUILD_INTERFACE:${CMAKE_BINARY_DIR}/include>
  $<INSTALL_INTERFACE:include> $<INSTALL_INTERFACE:include/qvplugcore>)

add_library(qv_static STATIC EXCLUDE_FROM_ALL $<TARGET_OBJECTS:qv_objects>)
target_link_libraries(qv_static PUBLIC qv_objects)

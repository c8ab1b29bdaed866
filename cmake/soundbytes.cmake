# The built-in sounds: computed by a program of the build, which writes them zlib-compressed as C++ arrays.
add_executable(qv_make_sounds ${CMAKE_SOURCE_DIR}/cmake/soundbytes/makesounds.cpp)
target_link_libraries(qv_make_sounds PRIVATE ZLIB::ZLIB)
set_target_properties(qv_make_sounds PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${CMAKE_BINARY_DIR}/generated)

set(QV_SOUNDS ${CMAKE_BINARY_DIR}/generated/soundbytes_data.inc)
add_custom_command(
  OUTPUT ${QV_SOUNDS}
  COMMAND qv_make_sounds ${QV_SOUNDS}
  DEPENDS qv_make_sounds
  COMMENT "Computing the built-in sounds"
  VERBATIM)
add_custom_target(qv_sounds DEPENDS ${QV_SOUNDS})

# Compiler cache, linker, warnings and sanitizers: the same for the library, the tool and the tests.
find_program(QV_CCACHE ccache)
if(QV_CCACHE)
  # The base folder makes objects of equal sources shareable between checkouts. Precompiled headers are known by
  # what they were made of, not by their time; and by their files, comments included, because the compiler knows
  # a header that is in one by its bytes: so nothing is looked up by preprocessed text (CCACHE_DEPEND).
  set(CMAKE_CXX_COMPILER_LAUNCHER
      ${CMAKE_COMMAND} -E env CCACHE_BASEDIR=${CMAKE_SOURCE_DIR} CCACHE_NOHASHDIR=1 CCACHE_DEPEND=1
      CCACHE_SLOPPINESS=pch_defines,time_macros ${QV_CCACHE})
endif()
find_program(QV_MOLD mold)
if(QV_MOLD)
  add_link_options(-fuse-ld=mold)
endif()

add_compile_options(-Wall -Wextra -Wconversion -fno-math-errno -ffp-contract=off
                    -fmacro-prefix-map=${CMAKE_SOURCE_DIR}/=)
if(CMAKE_CXX_COMPILER_ID STREQUAL GNU)
  add_compile_options(-Wno-restrict)  # GCC 12 sees overlaps in std::string that are not there
endif()
if(QV_WERROR)
  add_compile_options(-Werror)
endif()

# Sanitizers need frames and line numbers, and -O1 to be fast enough for whole transcodes.
set(CMAKE_CXX_FLAGS_SANITIZE "-O1 -g1 -fno-omit-frame-pointer")
# Fuzz targets are guided by what the library's own code covers.
if(QV_BUILD_FUZZ)
  add_compile_options(-fsanitize=fuzzer-no-link)
endif()
if(QV_SANITIZE)
  add_compile_options(-fsanitize=${QV_SANITIZE} -fno-sanitize-recover=all)
  add_link_options(-fsanitize=${QV_SANITIZE})
endif()

# Headers that most sources of a target read, compiled once. Sources still name what they use: the builds with
# sanitizers compile those of the library and the tool without this.
function(qv_precompile target)
  if(QV_PRECOMPILE STREQUAL ALL OR (QV_PRECOMPILE STREQUAL TESTS AND target MATCHES "^test_"))
    target_precompile_headers(${target} PRIVATE ${ARGN})
    qv_precompiled_warnings(${target})
  endif()
endfunction()

# The headers that the test program `other` has precompiled.
function(qv_precompile_as target other)
  if(NOT QV_PRECOMPILE STREQUAL NONE)
    target_precompile_headers(${target} REUSE_FROM ${other})
    qv_precompiled_warnings(${target})
  endif()
endfunction()

# A precompiled header is no system header to GCC 12, whose false alarms about std::string show then.
function(qv_precompiled_warnings target)
  if(CMAKE_CXX_COMPILER_ID STREQUAL GNU)
    target_compile_options(${target} PRIVATE -Wno-stringop-overflow -Wno-array-bounds)
  endif()
endfunction()

# How every target of the project is built: language level, warnings as errors, sanitizers, and one
# library per folder that links exactly what the folder may include.

find_package(Threads REQUIRED)

set(CMAKE_CXX_STANDARD 20)
set(CMAKE_CXX_STANDARD_REQUIRED ON)
set(CMAKE_CXX_EXTENSIONS OFF)
set(CMAKE_POSITION_INDEPENDENT_CODE ON)

# Every target of the project links this privately: none of it reaches a user of the libraries.
add_library(zr_build_flags INTERFACE)
target_compile_options(zr_build_flags INTERFACE -Wall -Wextra -Wpedantic -Werror)
target_include_directories(zr_build_flags INTERFACE "${PROJECT_SOURCE_DIR}")
target_link_libraries(zr_build_flags INTERFACE Threads::Threads)
if(CMAKE_CXX_COMPILER_ID STREQUAL "Clang")
  target_compile_options(zr_build_flags INTERFACE -Wthread-safety)
endif()
if(ZR_SANITIZER)
  target_compile_options(zr_build_flags INTERFACE
    -fsanitize=${ZR_SANITIZER} -fno-sanitize-recover=all -fno-omit-frame-pointer)
  target_link_options(zr_build_flags INTERFACE -fsanitize=${ZR_SANITIZER})
  # The standard library checks indices, empty optionals and null pointers too.
  target_compile_definitions(zr_build_flags INTERFACE _GLIBCXX_ASSERTIONS)
endif()
if(ZR_BUILD_FUZZ)
  target_compile_options(zr_build_flags INTERFACE -fsanitize=fuzzer-no-link)
endif()
# What is counted compiles with these; whatever it is linked into keeps the counts.
set(ZR_COVERAGE_OPTIONS "")
if(ZR_COVERAGE)
  set(ZR_COVERAGE_OPTIONS -fprofile-instr-generate -fcoverage-mapping -fprofile-update=atomic)
  target_link_options(zr_build_flags INTERFACE -fprofile-instr-generate)
endif()

# zr_hide_symbols(NAME)
# Whatever the target's code is linked into does not export it. Only the shared libraries export.
function(zr_hide_symbols name)
  set_target_properties(${name} PROPERTIES
    CXX_VISIBILITY_PRESET hidden
    VISIBILITY_INLINES_HIDDEN ON)
endfunction()

# zr_targets(OUT name...)
# The names with those of our folders as their targets: zr_NAME, so that a project which this one is a part
# of keeps its own short names.
function(zr_targets out)
  set(targets "")
  foreach(name IN LISTS ARGN)
    if(TARGET zr_${name})
      set(name zr_${name})
    endif()
    list(APPEND targets ${name})
  endforeach()
  set(${out} ${targets} PARENT_SCOPE)
endfunction()

# zr_component(NAME SHARED|STATIC [SOURCES file...] [USES name...] [PRIVATE_USES name...])
# The library zr_NAME of this folder, made of SOURCES or else of every source file in it but main.cpp. USES
# are the folders and libraries that its headers show; PRIVATE_USES stay inside. A shared one is what
# plug-ins and device modules link: zrlab::NAME, here and in the package.
function(zr_component name type)
  cmake_parse_arguments(PARSE_ARGV 2 arg "" "" "SOURCES;USES;PRIVATE_USES")
  if(NOT arg_SOURCES)
    file(GLOB arg_SOURCES CONFIGURE_DEPENDS "${CMAKE_CURRENT_SOURCE_DIR}/*.cpp")
    list(FILTER arg_SOURCES EXCLUDE REGEX "/main\\.cpp$")
  endif()
  set(target zr_${name})
  zr_targets(uses ${arg_USES})
  zr_targets(private_uses ${arg_PRIVATE_USES})
  add_library(${target} ${type} ${arg_SOURCES})
  target_link_libraries(${target} PUBLIC ${uses} PRIVATE "$<BUILD_INTERFACE:zr_build_flags>" ${private_uses})
  target_include_directories(${target} PUBLIC "$<BUILD_INTERFACE:${PROJECT_SOURCE_DIR}>")
  target_compile_features(${target} PUBLIC cxx_std_20)
  if(type STREQUAL "SHARED")
    set_target_properties(${target} PROPERTIES
      EXPORT_NAME ${name}
      VERSION "${PROJECT_VERSION}"
      SOVERSION "${PROJECT_VERSION_MAJOR}")
    add_library(zrlab::${name} ALIAS ${target})
  else()
    zr_hide_symbols(${target})
  endif()
endfunction()

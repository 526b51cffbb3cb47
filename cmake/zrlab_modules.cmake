# How a module that zrlab loads is built; part of the package zrlab, and of the project's own build.
#
#   zrlab_add_plugin(NAME source...)         a plug-in: experiments, analyses, diagnostics
#   zrlab_add_device_module(NAME source...)  a device module: kinds of devices
#
# The target NAME builds the file NAME.so. It hides its symbols, so that two modules cannot mix theirs
# up, and it is never unmapped: zrlab keeps what a module registers, and a pending work item may run its
# code long after a run has ended. What it leaves undefined fails when it is linked, not when it is loaded.
include_guard(GLOBAL)

function(_zrlab_add_module name)
  add_library(${name} MODULE ${ARGN})
  set_target_properties(${name} PROPERTIES
    PREFIX ""
    CXX_EXTENSIONS OFF
    CXX_VISIBILITY_PRESET hidden
    VISIBILITY_INLINES_HIDDEN ON)
  target_compile_features(${name} PRIVATE cxx_std_20)
  target_link_libraries(${name} PRIVATE zrlab::platform)
  target_link_options(${name} PRIVATE -Wl,-z,nodelete -Wl,--exclude-libs,ALL)
  # clang leaves a sanitizer's runtime undefined in a shared object.
  if(NOT ZR_SANITIZER AND NOT "${CMAKE_CXX_FLAGS} ${CMAKE_MODULE_LINKER_FLAGS}" MATCHES "-fsanitize")
    target_link_options(${name} PRIVATE -Wl,-z,defs)
  endif()
endfunction()

function(zrlab_add_plugin name)
  _zrlab_add_module(${name} ${ARGN})
  target_link_libraries(${name} PRIVATE zrlab::host_interface)
endfunction()

function(zrlab_add_device_module name)
  _zrlab_add_module(${name} ${ARGN})
  target_link_libraries(${name} PRIVATE zrlab::devices)
endfunction()

# What is installed, and the Debian package. Everything is found relative to the program, so the
# installed tree can be moved as a whole.
include(CMakePackageConfigHelpers)

set(data "${CMAKE_INSTALL_DATAROOTDIR}")
set(documents "${data}/doc/zrlab")
set(headers "${CMAKE_INSTALL_INCLUDEDIR}/zrlab")
set(package "${CMAKE_INSTALL_LIBDIR}/cmake/zrlab")

# The program, the libraries that it shares with its modules, the plug-in module.
file(RELATIVE_PATH libraries_from_program
  "${CMAKE_INSTALL_FULL_BINDIR}" "${CMAKE_INSTALL_FULL_LIBDIR}")
set_target_properties(zrlab PROPERTIES INSTALL_RPATH "$ORIGIN/${libraries_from_program}")
set_target_properties(zr_platform zr_host_interface zr_devices PROPERTIES INSTALL_RPATH "$ORIGIN")
set_target_properties(zr_plugin zr_store_sqlite zr_store_postgres PROPERTIES INSTALL_RPATH "$ORIGIN/..")
install(TARGETS zrlab)
install(TARGETS zr_platform zr_host_interface zr_devices zr_faulty
  EXPORT zrlab-targets INCLUDES DESTINATION "${headers}")
install(TARGETS zr_plugin zr_store_sqlite zr_store_postgres LIBRARY DESTINATION "${CMAKE_INSTALL_LIBDIR}/zrlab")

# What plug-ins, device modules and tests of them are built against.
install(DIRECTORY "${PROJECT_SOURCE_DIR}/platform" DESTINATION "${headers}"
  FILES_MATCHING PATTERN "*.h")
install(FILES "${PROJECT_SOURCE_DIR}/frame/host_interface.h" DESTINATION "${headers}/frame")
file(GLOB device_headers CONFIGURE_DEPENDS "${PROJECT_SOURCE_DIR}/devices/*.h")
install(FILES ${device_headers} DESTINATION "${headers}/devices")
install(
  FILES
    "${PROJECT_SOURCE_DIR}/devices/faulty/fault.h"
    "${PROJECT_SOURCE_DIR}/devices/faulty/faulty_device.h"
  DESTINATION "${headers}/devices/faulty")
configure_package_config_file(
  "${PROJECT_SOURCE_DIR}/cmake/package/zrlab-config.cmake.in"
  "${PROJECT_BINARY_DIR}/package/zrlab-config.cmake"
  INSTALL_DESTINATION "${package}"
  PATH_VARS CMAKE_INSTALL_BINDIR
  NO_CHECK_REQUIRED_COMPONENTS_MACRO)
write_basic_package_version_file("${PROJECT_BINARY_DIR}/package/zrlab-config-version.cmake"
  COMPATIBILITY SameMajorVersion)
install(EXPORT zrlab-targets NAMESPACE zrlab:: DESTINATION "${package}")
install(
  FILES
    "${PROJECT_BINARY_DIR}/package/zrlab-config.cmake"
    "${PROJECT_BINARY_DIR}/package/zrlab-config-version.cmake"
    "${PROJECT_SOURCE_DIR}/cmake/zrlab_modules.cmake"
  DESTINATION "${package}")

# The manual page and the completions, as the program prints them.
set(manual "${PROJECT_BINARY_DIR}/package/zrlab.1")
set(bash_completion "${PROJECT_BINARY_DIR}/package/bash/zrlab")
set(zsh_completion "${PROJECT_BINARY_DIR}/package/zsh/_zrlab")
file(MAKE_DIRECTORY "${PROJECT_BINARY_DIR}/package/bash" "${PROJECT_BINARY_DIR}/package/zsh")
add_custom_command(
  OUTPUT "${manual}.gz" "${bash_completion}" "${zsh_completion}"
  COMMAND zrlab manual > "${manual}"
  COMMAND gzip -9nf "${manual}"
  COMMAND zrlab completion bash > "${bash_completion}"
  COMMAND zrlab completion zsh > "${zsh_completion}"
  DEPENDS zrlab
  VERBATIM)
add_custom_target(zr_printed_documents ALL
  DEPENDS "${manual}.gz" "${bash_completion}" "${zsh_completion}")
install(FILES "${manual}.gz" DESTINATION "${CMAKE_INSTALL_MANDIR}/man1")
install(FILES "${bash_completion}" DESTINATION "${data}/bash-completion/completions")
install(FILES "${zsh_completion}" DESTINATION "${data}/zsh/vendor-completions")

# The gallery, the sample of limits, the documents, the examples, the notices.
install(DIRECTORY "${PROJECT_SOURCE_DIR}/profiles" DESTINATION "${data}/zrlab"
  FILES_MATCHING PATTERN "*.json" PATTERN "expected-outcomes.json" EXCLUDE)
install(DIRECTORY "${PROJECT_SOURCE_DIR}/limits" DESTINATION "${data}/zrlab")
install(DIRECTORY "${PROJECT_SOURCE_DIR}/docs/" DESTINATION "${documents}"
  FILES_MATCHING PATTERN "*.md" PATTERN "*.schema.json" PATTERN "images" EXCLUDE)
install(DIRECTORY "${PROJECT_SOURCE_DIR}/examples" DESTINATION "${documents}"
  PATTERN "build" EXCLUDE)
install(FILES "${PROJECT_SOURCE_DIR}/cmake/package/copyright" DESTINATION "${documents}")

# cpack makes zrlab_VERSION_ARCHITECTURE.deb.
set(CPACK_GENERATOR DEB)
set(CPACK_PACKAGE_NAME zrlab)
set(CPACK_PACKAGE_VENDOR "zrlab developers")
set(CPACK_PACKAGE_CONTACT "zrlab developers <zrlab@localhost>")
set(CPACK_PACKAGE_DESCRIPTION_SUMMARY "bench for hardware diagnostics in plug-in modules")
set(CPACK_PACKAGE_DESCRIPTION
  "zrlab runs the diagnostics of a plug-in module on a device, judges their limits and reports.
It brings a gallery of simulated devices and what authors of plug-ins and device modules build against.")
set(CPACK_STRIP_FILES ON)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_SECTION utils)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
# Only a store on a server needs libpq: whoever has none need not install it.
set(CPACK_DEBIAN_PACKAGE_RECOMMENDS libpq5)
set(CPACK_PROJECT_CONFIG_FILE "${PROJECT_SOURCE_DIR}/cmake/package/cpack_options.cmake")
include(CPack)

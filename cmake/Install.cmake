# What a package of this project holds, for one prefix: the libraries and their headers, how other
# builds find them, the command with its manual pages and completions, and the systemd units.
include(CMakePackageConfigHelpers)

set(SECPOLICY_HEADERS "${CMAKE_INSTALL_INCLUDEDIR}/libsecpolicy")
set(SECPOLICY_CMAKE "${CMAKE_INSTALL_LIBDIR}/cmake/secpolicy")
set(SECPOLICY_UNITS "lib/systemd/system" CACHE STRING "Where systemd units go, below the prefix")

# Libraries and headers. A caller's include paths begin at the public header, at the contract headers
# that it includes, and at those of the Linux host.
target_include_directories(host_contract INTERFACE "$<INSTALL_INTERFACE:${SECPOLICY_HEADERS}>")
set_target_properties(secpolicy PROPERTIES INSTALL_RPATH "$ORIGIN" BUILD_WITH_INSTALL_RPATH ON)
install(TARGETS secpolicy secpolicyhost secpolicyhost_headers host_contract EXPORT secpolicyTargets
  LIBRARY DESTINATION "${CMAKE_INSTALL_LIBDIR}")
# Never linked to, so without the name for linkers.
install(TARGETS secpolicyhost_archive
  LIBRARY DESTINATION "${CMAKE_INSTALL_LIBDIR}" NAMELINK_SKIP)
install(FILES secpolicy/secpolicy.h secpolicy/export.h
  DESTINATION "${SECPOLICY_HEADERS}/secpolicy")
install(DIRECTORY host/include/ DESTINATION "${SECPOLICY_HEADERS}")
install(DIRECTORY host/linux/include/ DESTINATION "${SECPOLICY_HEADERS}")

# For find_package and pkg-config.
install(EXPORT secpolicyTargets NAMESPACE secpolicy:: DESTINATION "${SECPOLICY_CMAKE}")
configure_package_config_file(cmake/secpolicyConfig.cmake.in secpolicyConfig.cmake
  INSTALL_DESTINATION "${SECPOLICY_CMAKE}")
write_basic_package_version_file(secpolicyConfigVersion.cmake COMPATIBILITY SameMajorVersion)
install(FILES "${PROJECT_BINARY_DIR}/secpolicyConfig.cmake"
  "${PROJECT_BINARY_DIR}/secpolicyConfigVersion.cmake" DESTINATION "${SECPOLICY_CMAKE}")
file(RELATIVE_PATH SECPOLICY_PC_TO_PREFIX
  "${CMAKE_INSTALL_FULL_LIBDIR}/pkgconfig" "${CMAKE_INSTALL_PREFIX}")
configure_file(packaging/secpolicy.pc.in secpolicy.pc @ONLY)
install(FILES "${PROJECT_BINARY_DIR}/secpolicy.pc" DESTINATION "${CMAKE_INSTALL_LIBDIR}/pkgconfig")

# The command.
install(TARGETS secpolicy_cli)
install(TARGETS secpolicy_run DESTINATION "${CMAKE_INSTALL_LIBEXECDIR}/secpolicy")
install(FILES docs/man/secpolicy.5 DESTINATION "${CMAKE_INSTALL_MANDIR}/man5")
install(FILES docs/man/secpolicy.8 docs/man/secpolicy-run.8 DESTINATION "${CMAKE_INSTALL_MANDIR}/man8")
install(FILES completions/secpolicy.bash RENAME secpolicy
  DESTINATION "${CMAKE_INSTALL_DATADIR}/bash-completion/completions")
install(FILES completions/_secpolicy
  DESTINATION "${CMAKE_INSTALL_DATADIR}/zsh/vendor-completions")
install(FILES completions/secpolicy.fish
  DESTINATION "${CMAKE_INSTALL_DATADIR}/fish/vendor_completions.d")
foreach(unit boot restore load)
  configure_file(packaging/systemd/secpolicy-${unit}.service.in secpolicy-${unit}.service @ONLY)
  install(FILES "${PROJECT_BINARY_DIR}/secpolicy-${unit}.service" DESTINATION "${SECPOLICY_UNITS}")
endforeach()
install(FILES LICENSE README.md CHANGELOG.md docs/policy-format.md docs/diagnostics.md
  docs/json.md docs/queries.md docs/graph.svg
  DESTINATION "${CMAKE_INSTALL_DOCDIR}")
install(DIRECTORY docs/schema DESTINATION "${CMAKE_INSTALL_DOCDIR}")

# `cpack` in the build directory makes a Debian package.
set(CPACK_GENERATOR DEB)
set(CPACK_PACKAGE_NAME libsecpolicy)
set(CPACK_PACKAGE_CONTACT "The libsecpolicy authors")
set(CPACK_PACKAGING_INSTALL_PREFIX /usr)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_SECTION libs)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
set(CPACK_STRIP_FILES ON)
include(CPack)

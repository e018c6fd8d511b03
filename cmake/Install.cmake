# What the packages of this project hold, for one prefix: each component of the installation is a
# package, in debian/control and for `cpack`.
include(CMakePackageConfigHelpers)
include(Documents)

set(SECPOLICY_HEADERS "${CMAKE_INSTALL_INCLUDEDIR}/libsecpolicy")
set(SECPOLICY_CMAKE "${CMAKE_INSTALL_LIBDIR}/cmake/secpolicy")
set(SECPOLICY_UNITS "lib/systemd/system" CACHE STRING "Where systemd units go, below the prefix")
set(SECPOLICY_CATALOG "lib/systemd/catalog" CACHE STRING
  "Where explanations of journal entries go, below the prefix")

# Libraries and headers. A caller's include paths begin at the public header, at the contract headers
# that it includes, and at those of the Linux host.
target_include_directories(host_contract INTERFACE "$<INSTALL_INTERFACE:${SECPOLICY_HEADERS}>")
# In the system's own directories the loader looks anyway.
if(NOT CMAKE_INSTALL_PREFIX STREQUAL "/usr")
  set_target_properties(secpolicy PROPERTIES INSTALL_RPATH "$ORIGIN" BUILD_WITH_INSTALL_RPATH ON)
endif()
install(TARGETS secpolicy EXPORT secpolicyTargets
  LIBRARY DESTINATION "${CMAKE_INSTALL_LIBDIR}"
  COMPONENT libsecpolicy1 NAMELINK_COMPONENT libsecpolicy-dev)
install(TARGETS secpolicyhost secpolicyhost_headers host_contract EXPORT secpolicyTargets
  LIBRARY DESTINATION "${CMAKE_INSTALL_LIBDIR}"
  COMPONENT libsecpolicyhost1 NAMELINK_COMPONENT libsecpolicy-dev)

foreach(component libsecpolicy1 libsecpolicyhost1 libsecpolicy-dev secpolicy)
  install(FILES LICENSE DESTINATION "${CMAKE_INSTALL_DATADIR}/doc/${component}"
    COMPONENT ${component})
endforeach()

set(CMAKE_INSTALL_DEFAULT_COMPONENT_NAME libsecpolicy-dev)
install(FILES secpolicy/secpolicy.h secpolicy/export.h
  DESTINATION "${SECPOLICY_HEADERS}/secpolicy")
install(DIRECTORY host/include/ DESTINATION "${SECPOLICY_HEADERS}")
install(DIRECTORY host/linux/include/ DESTINATION "${SECPOLICY_HEADERS}")
install_documents("${CMAKE_INSTALL_DATADIR}/doc/libsecpolicy-dev"
  docs/abi.md docs/embed.md examples/runtime.cpp)

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

# The command, with the libraries that are never linked to, only loaded by the verbs that need them.
set(CMAKE_INSTALL_DEFAULT_COMPONENT_NAME secpolicy)
install(TARGETS secpolicy_cli)
set(late_libraries secpolicyhost_archive secpolicy_signature)
if(TARGET secpolicy_module)
  list(APPEND late_libraries secpolicy_module)
endif()
install(TARGETS ${late_libraries}
  LIBRARY DESTINATION "${CMAKE_INSTALL_LIBDIR}/secpolicy" NAMELINK_SKIP)
install(TARGETS secpolicy_run DESTINATION "${CMAKE_INSTALL_LIBEXECDIR}/secpolicy")
install(FILES docs/man/secpolicy.5 DESTINATION "${CMAKE_INSTALL_MANDIR}/man5")
install(FILES docs/man/secpolicy.8 docs/man/secpolicy-run.8 DESTINATION "${CMAKE_INSTALL_MANDIR}/man8")
install(FILES completions/secpolicy.bash RENAME secpolicy
  DESTINATION "${CMAKE_INSTALL_DATADIR}/bash-completion/completions")
install(FILES completions/_secpolicy
  DESTINATION "${CMAKE_INSTALL_DATADIR}/zsh/vendor-completions")
install(FILES completions/secpolicy.fish
  DESTINATION "${CMAKE_INSTALL_DATADIR}/fish/vendor_completions.d")
if(TARGET secpolicy_log)
  install(TARGETS secpolicy_log)
  install(FILES docs/man/secpolicy-log.8 DESTINATION "${CMAKE_INSTALL_MANDIR}/man8")
  install(FILES completions/secpolicy-log.bash RENAME secpolicy-log
    DESTINATION "${CMAKE_INSTALL_DATADIR}/bash-completion/completions")
  install(FILES completions/_secpolicy-log
    DESTINATION "${CMAKE_INSTALL_DATADIR}/zsh/vendor-completions")
  install(FILES completions/secpolicy-log.fish
    DESTINATION "${CMAKE_INSTALL_DATADIR}/fish/vendor_completions.d")
  configure_file(packaging/systemd/secpolicy-log.service.in secpolicy-log.service @ONLY)
  install(FILES "${PROJECT_BINARY_DIR}/secpolicy-log.service" DESTINATION "${SECPOLICY_UNITS}")
endif()
foreach(unit boot restore load module metrics drift)
  configure_file(packaging/systemd/secpolicy-${unit}.service.in secpolicy-${unit}.service @ONLY)
  install(FILES "${PROJECT_BINARY_DIR}/secpolicy-${unit}.service" DESTINATION "${SECPOLICY_UNITS}")
endforeach()
install(FILES packaging/systemd/secpolicy-metrics.timer packaging/systemd/secpolicy-drift.timer
  DESTINATION "${SECPOLICY_UNITS}")
install(FILES packaging/systemd/secpolicy.catalog DESTINATION "${SECPOLICY_CATALOG}")
install(DIRECTORY examples/broken examples/host examples/systemd packaging/monitoring packaging/ansible
  DESTINATION "${CMAKE_INSTALL_DOCDIR}/examples" USE_SOURCE_PERMISSIONS)
install(PROGRAMS scripts/pack-example DESTINATION "${CMAKE_INSTALL_DOCDIR}/examples")
install(DIRECTORY docs/schema DESTINATION "${CMAKE_INSTALL_DOCDIR}/docs")
install_documents("${CMAKE_INSTALL_DOCDIR}" README.md CHANGELOG.md SECURITY.md
  docs/getting-started.md docs/confine-a-service.md docs/add-a-tardisk.md docs/why-refused.md
  docs/bundles.md docs/fleet.md docs/policy-format.md docs/diagnostics.md docs/enforcement.md docs/json.md docs/linux-host.md
  docs/messages.md docs/module.md docs/monitoring.md docs/performance.md docs/python.md docs/queries.md docs/report.md docs/runtime.md
  docs/graph.svg docs/images/editor.png docs/images/monitoring.png docs/images/report.png docs/images/rollout.png)

include(Rpm)

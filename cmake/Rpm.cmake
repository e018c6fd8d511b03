# `cpack` in the build directory makes RPM packages, one for each component. What they need of other
# packages is found by rpmbuild.
set(CPACK_GENERATOR RPM)
set(CPACK_PACKAGE_VENDOR "The libsecpolicy authors")
set(CPACK_PACKAGE_CONTACT "${CPACK_PACKAGE_VENDOR}")
set(CPACK_PACKAGING_INSTALL_PREFIX /usr)
set(CPACK_STRIP_FILES ON)
set(CPACK_RPM_PACKAGE_LICENSE MIT)
set(CPACK_RPM_PACKAGE_DESCRIPTION
  "Reads the security policy of a host from plain text files, installs it, shows and explains it.")
set(CPACK_RPM_PACKAGE_RELOCATABLE OFF)
set(CPACK_RPM_FILE_NAME RPM-DEFAULT)
set(CPACK_RPM_COMPONENT_INSTALL ON)
set(CPACK_COMPONENTS_ALL libsecpolicy1 libsecpolicyhost1 libsecpolicy-dev secpolicy)
foreach(component ${CPACK_COMPONENTS_ALL})
  set(CPACK_RPM_${component}_PACKAGE_NAME ${component})
endforeach()
set(CPACK_RPM_libsecpolicy-dev_PACKAGE_REQUIRES
  "libsecpolicy1 = ${PROJECT_VERSION}, libsecpolicyhost1 = ${PROJECT_VERSION}")

# These belong to the system, or to whatever other packages they are for.
set(prefix "${CPACK_PACKAGING_INSTALL_PREFIX}")
set(CPACK_RPM_EXCLUDE_FROM_AUTO_FILELIST_ADDITION
  "${prefix}/${CMAKE_INSTALL_LIBDIR}"
  "${prefix}/${CMAKE_INSTALL_LIBDIR}/cmake"
  "${prefix}/${CMAKE_INSTALL_LIBDIR}/pkgconfig"
  "${prefix}/${CMAKE_INSTALL_LIBEXECDIR}"
  "${prefix}/lib/systemd"
  "${prefix}/lib/systemd/catalog"
  "${prefix}/lib/systemd/system"
  "${prefix}/share/man"
  "${prefix}/share/man/man5"
  "${prefix}/share/man/man8"
  "${prefix}/share/bash-completion"
  "${prefix}/share/bash-completion/completions"
  "${prefix}/share/fish"
  "${prefix}/share/fish/vendor_completions.d"
  "${prefix}/share/zsh"
  "${prefix}/share/zsh/vendor-completions")
include(CPack)

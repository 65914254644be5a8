# Installation of the tool and its manual page, and the Debian package that
# cpack -G DEB builds from it. The appliance's service control program and
# its set-up are not part of the package.

set(DAVSYNC_VERSION 1.0.0)

# Debian wants manual pages and changelogs compressed, without a timestamp.
function(davsync_gzip source output)
  add_custom_command(OUTPUT ${output}
    COMMAND gzip -9nc ${source} > ${output}
    DEPENDS ${source} VERBATIM)
endfunction()
davsync_gzip(${PROJECT_SOURCE_DIR}/docs/davsync.8 ${PROJECT_BINARY_DIR}/davsync.8.gz)
davsync_gzip(${PROJECT_SOURCE_DIR}/docs/changelog ${PROJECT_BINARY_DIR}/changelog.gz)
add_custom_target(davsync_docs ALL
  DEPENDS ${PROJECT_BINARY_DIR}/davsync.8.gz ${PROJECT_BINARY_DIR}/changelog.gz)

install(FILES ${PROJECT_BINARY_DIR}/davsync.8.gz DESTINATION ${CMAKE_INSTALL_MANDIR}/man8)
install(FILES ${PROJECT_SOURCE_DIR}/docs/copyright ${PROJECT_BINARY_DIR}/changelog.gz
  DESTINATION ${CMAKE_INSTALL_DOCDIR})

set(CPACK_PACKAGE_NAME davsync)
set(CPACK_PACKAGE_VERSION ${DAVSYNC_VERSION})
set(CPACK_PACKAGE_CONTACT "davsync developers <davsync@example.org>")
set(CPACK_DEBIAN_PACKAGE_MAINTAINER "${CPACK_PACKAGE_CONTACT}")
set(CPACK_PACKAGE_DESCRIPTION_SUMMARY
  "keeps a storage appliance's WebDAV server in step with its shares")
set(CPACK_PACKAGE_DESCRIPTION
  "davsync reads a storage appliance's share catalogue, its per-volume WebDAV
share lists and its marked USB volumes, reconciles them, and writes the
configuration and links of the appliance's Apache httpd 2.4 WebDAV instance,
which it then restarts or stops.")
set(CPACK_PACKAGING_INSTALL_PREFIX /usr)
set(CPACK_STRIP_FILES ON)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_SECTION admin)
set(CPACK_DEBIAN_PACKAGE_PRIORITY optional)
# Computed from the binary: libxml2, libstdc++, libc.
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
include(CPack)

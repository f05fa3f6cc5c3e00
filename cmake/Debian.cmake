# SPDX-License-Identifier: Apache-2.0
# The Debian packages that scripts/package makes: the program, the shared libraries and what developers need.

set(CPACK_GENERATOR DEB)
set(CPACK_PACKAGE_VENDOR Quilt)
set(CPACK_PACKAGE_CONTACT "The Quilt maintainers <maintainers@quilt.example>")
set(CPACK_PACKAGE_VERSION ${PROJECT_VERSION})
set(CPACK_STRIP_FILES ON)
set(CPACK_DEB_COMPONENT_INSTALL ON)
set(CPACK_COMPONENTS_ALL program library development)
set(CPACK_COMPONENTS_GROUPING IGNORE)
set(CPACK_DEBIAN_PACKAGE_RELEASE 1)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_CONTROL_STRICT_PERMISSION ON)
set(version "${PROJECT_VERSION}-${CPACK_DEBIAN_PACKAGE_RELEASE}")
set(library libquilt${PROJECT_VERSION_MAJOR}.${PROJECT_VERSION_MINOR})

# Debian's own package quilt is a tool for patches, and its program has the same name.
set(CPACK_DEBIAN_PROGRAM_PACKAGE_NAME quilt-media)
set(CPACK_DEBIAN_PROGRAM_PACKAGE_SECTION video)
set(CPACK_DEBIAN_PROGRAM_PACKAGE_DEPENDS "${library} (= ${version})")
set(CPACK_DEBIAN_PROGRAM_PACKAGE_RECOMMENDS xdg-utils)
set(CPACK_DEBIAN_PROGRAM_PACKAGE_CONFLICTS quilt)
set(CPACK_COMPONENT_PROGRAM_DESCRIPTION "makes interactive media packages
Movies, audio, images, PDF, EPUB and office documents, web links and lectures
become packages that stand alone and open offline in any browser.
This is the program, with its themes.")

set(CPACK_DEBIAN_LIBRARY_PACKAGE_NAME ${library})
set(CPACK_DEBIAN_LIBRARY_PACKAGE_SECTION libs)
set(CPACK_DEBIAN_LIBRARY_PACKAGE_RECOMMENDS "quilt-media (= ${version})")
set(CPACK_DEBIAN_LIBRARY_PACKAGE_SUGGESTS "libreoffice-writer-nogui | libreoffice-writer, libreoffice-impress-nogui | libreoffice-impress")
set(CPACK_COMPONENT_LIBRARY_DESCRIPTION "library for interactive media packages
The document model, the services behind it and the bridge to browsers, for
desktop applications that make interactive media packages.
LibreOffice, where it is installed, shows office documents.")

set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_NAME libquilt-dev)
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_SECTION libdevel)
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_DEPENDS "${library} (= ${version})")
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_SUGGESTS "libavformat-dev, libavfilter-dev, libvips-dev, libcairo2-dev, libzip-dev, libmupdf-dev, libpugixml-dev, libicu-dev")
set(CPACK_COMPONENT_DEVELOPMENT_DESCRIPTION "library for interactive media packages (development files)
Headers, archives and the files for CMake and pkg-config. Linking the
archives, instead of the shared libraries, needs the suggested packages.")

# Depends comes from what the programs are linked with; our own libraries are in no installed package yet.
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_SHLIBDEPS OFF)
set(CPACK_DEBIAN_PACKAGE_GENERATE_SHLIBS ON)
set(CPACK_DEBIAN_PACKAGE_GENERATE_SHLIBS_POLICY "=")
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS_PRIVATE_DIRS ${PROJECT_BINARY_DIR})

# What Debian asks of every package: its licences, its history, and manual pages that are packed.
set(documents ${PROJECT_BINARY_DIR}/debian)
file(MAKE_DIRECTORY ${documents})
configure_file(cmake/package/changelog.in ${documents}/changelog.Debian @ONLY)
execute_process(COMMAND gzip -9 -n -f -k ${documents}/changelog.Debian COMMAND_ERROR_IS_FATAL ANY)
foreach(component program library development)
  string(TOUPPER ${component} name)
  install(FILES ${documents}/changelog.Debian.gz DESTINATION share/doc/${CPACK_DEBIAN_${name}_PACKAGE_NAME} COMPONENT ${component})
  install(FILES cmake/package/copyright DESTINATION share/doc/${CPACK_DEBIAN_${name}_PACKAGE_NAME} COMPONENT ${component})
endforeach()
install(CODE "
  file(GLOB pages \"\$ENV{DESTDIR}\${CMAKE_INSTALL_PREFIX}/${CMAKE_INSTALL_MANDIR}/man1/*.1\")
  execute_process(COMMAND gzip -9 -n -f \${pages} COMMAND_ERROR_IS_FATAL ANY)
" COMPONENT program)

include(CPack)

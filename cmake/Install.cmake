# SPDX-License-Identifier: Apache-2.0
# What cmake --install installs. Components: program, library (the shared libraries) and development.

include(CMakePackageConfigHelpers)
set(package_folder ${CMAKE_INSTALL_LIBDIR}/cmake/Quilt)
set(pkgconfig_folder ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
set(CMAKE_INSTALL_DEFAULT_COMPONENT_NAME development)

# The libraries, each with a file of its own that declares it, so that who asks for one needs nothing of another.
foreach(kind_installed ${QUILT_LIBRARY_KINDS})
  foreach(name model platform bridge)
    install(TARGETS quilt_${name}_${kind_installed} EXPORT quilt_${name}_${kind_installed}
            LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR} COMPONENT library NAMELINK_COMPONENT development
            ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR} COMPONENT development
            FILE_SET HEADERS DESTINATION ${CMAKE_INSTALL_INCLUDEDIR} COMPONENT development
            INCLUDES DESTINATION ${CMAKE_INSTALL_INCLUDEDIR})
    install(EXPORT quilt_${name}_${kind_installed} NAMESPACE Quilt:: DESTINATION ${package_folder}
            FILE Quilt-${name}-${kind_installed}.cmake)
  endforeach()
endforeach()

# find_package(Quilt CONFIG)
set(QUILT_STATIC_MODULES "")
foreach(group FFMPEG VIPS CAIRO ZIP)
  if(QUILT_WITH_${group})
    list(JOIN QUILT_${group}_MODULES " " modules)
    string(APPEND QUILT_STATIC_MODULES "  _quilt_need(${group} ${modules})\n")
  endif()
endforeach()
if(QUILT_WITH_MUPDF)
  string(APPEND QUILT_STATIC_MODULES "  include(\${CMAKE_CURRENT_LIST_DIR}/FindMuPDF.cmake)\n")
endif()
configure_package_config_file(cmake/package/QuiltConfig.cmake.in QuiltConfig.cmake INSTALL_DESTINATION ${package_folder}
                              NO_SET_AND_CHECK_MACRO NO_CHECK_REQUIRED_COMPONENTS_MACRO)
write_basic_package_version_file(QuiltConfigVersion.cmake COMPATIBILITY SameMinorVersion)
install(FILES ${PROJECT_BINARY_DIR}/QuiltConfig.cmake ${PROJECT_BINARY_DIR}/QuiltConfigVersion.cmake
        cmake/FindMuPDF.cmake DESTINATION ${package_folder})

# pkg-config. What an archive needs in turn is named as flags: naming it as modules would ask everyone for their packages.
set(needed_libraries ${FFMPEG_LDFLAGS} ${VIPS_LDFLAGS} ${CAIRO_LDFLAGS} ${ZIP_LDFLAGS} -lpugixml -licui18n -licuuc)
if(QUILT_WITH_MUPDF)
  set(mupdf -lmupdf)
  if(MUPDF_THIRD_LIBRARY)
    list(APPEND mupdf -lmupdf-third)
  endif()
  list(APPEND needed_libraries ${mupdf} ${MUPDF_NEEDS_LDFLAGS} -ljbig2dec -lgumbo -lmujs)
endif()
list(FILTER needed_libraries EXCLUDE REGEX "^-L/usr/lib")
list(REMOVE_DUPLICATES needed_libraries)
file(RELATIVE_PATH prefix_from_pkgconfig /${pkgconfig_folder} /)
string(REGEX REPLACE "/$" "" prefix_from_pkgconfig "${prefix_from_pkgconfig}")
# quilt_pkg_config(module "what" REQUIRES... [LIBS...] [NEEDS...])
function(quilt_pkg_config module what)
  cmake_parse_arguments(PARSE_ARGV 2 arg "" "" "REQUIRES;LIBS;NEEDS")
  list(JOIN arg_NEEDS " " needs)
  list(JOIN arg_LIBS " " libs)
  list(TRANSFORM arg_REQUIRES APPEND " = ${PROJECT_VERSION}" OUTPUT_VARIABLE requires)
  list(JOIN requires ", " requires)
  if(NOT shared IN_LIST QUILT_LIBRARY_KINDS)  # there are archives only: everyone needs it
    string(APPEND libs " ${needs}")
    set(needs "")
  endif()
  configure_file(cmake/package/quilt.pc.in pkgconfig/${module}.pc @ONLY)
  install(FILES ${PROJECT_BINARY_DIR}/pkgconfig/${module}.pc DESTINATION ${pkgconfig_folder})
endfunction()
quilt_pkg_config(quilt-model "the model of interactive media packages" LIBS -lquilt-model NEEDS -pthread)
quilt_pkg_config(quilt-platform "the services behind the model: files, movies, images, documents"
                 REQUIRES quilt-model LIBS -lquilt-platform NEEDS ${needed_libraries})
quilt_pkg_config(quilt-bridge "serves a document to browsers with the live model behind it"
                 REQUIRES quilt-model LIBS -lquilt-bridge NEEDS -pthread)
quilt_pkg_config(quilt "interactive media packages: the model and its platform" REQUIRES quilt-model quilt-platform)

# The program, with what it finds beside itself.
set(CMAKE_INSTALL_DEFAULT_COMPONENT_NAME program)
if(NOT QUILT_DEBIAN)  # which has the licence itself
  install(FILES LICENSE DESTINATION ${CMAKE_INSTALL_DATADIR}/doc/quilt)
endif()
install(DIRECTORY quilt/resources/themes/ DESTINATION ${CMAKE_INSTALL_DATADIR}/quilt/Themes)
install(FILES schema/manifest.schema.json DESTINATION ${CMAKE_INSTALL_DATADIR}/quilt/schema)
if(QUILT_BUILD_CLI)
  file(RELATIVE_PATH libraries_from_program /${CMAKE_INSTALL_BINDIR} /${CMAKE_INSTALL_LIBDIR})
  set_target_properties(quilt_program PROPERTIES INSTALL_RPATH "$<$<BOOL:${BUILD_SHARED_LIBS}>:$ORIGIN/${libraries_from_program}>")
  install(TARGETS quilt_program RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR})

  # The program prints its own manual and completions, from the one table of its options.
  set(printed ${PROJECT_BINARY_DIR}/printed)
  add_custom_command(OUTPUT ${printed}/stamp
    COMMAND ${CMAKE_COMMAND} -DPROGRAM=$<TARGET_FILE:quilt_program> -DFOLDER=${printed}
            -P ${PROJECT_SOURCE_DIR}/cmake/PrintManual.cmake
    DEPENDS quilt_program cmake/PrintManual.cmake COMMENT "Printing the manual and the completions" VERBATIM)
  add_custom_target(quilt_manual ALL DEPENDS ${printed}/stamp)
  install(DIRECTORY ${printed}/man1 DESTINATION ${CMAKE_INSTALL_MANDIR})
  install(FILES ${printed}/quilt.bash DESTINATION ${CMAKE_INSTALL_DATADIR}/bash-completion/completions RENAME quilt)
  install(FILES ${printed}/_quilt DESTINATION
          ${CMAKE_INSTALL_DATADIR}/zsh/$<IF:$<BOOL:${QUILT_DEBIAN}>,vendor-completions,site-functions>)
  install(FILES ${printed}/quilt.fish DESTINATION ${CMAKE_INSTALL_DATADIR}/fish/vendor_completions.d)
endif()

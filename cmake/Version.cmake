# SPDX-License-Identifier: Apache-2.0
# The version is written down once, in quilt/version.h; this reads it for project().

file(STRINGS ${CMAKE_CURRENT_SOURCE_DIR}/quilt/version.h lines REGEX "^#define QUILT_VERSION[_A-Z]* ")
foreach(part MAJOR MINOR PATCH)
  string(REGEX MATCH "QUILT_VERSION_${part} ([0-9]+)" found "${lines}")
  set(quilt_${part} ${CMAKE_MATCH_1})
endforeach()
string(REGEX MATCH "QUILT_VERSION \"([0-9.]+)\"" found "${lines}")
set(QUILT_HEADER_VERSION ${CMAKE_MATCH_1})
if(NOT QUILT_HEADER_VERSION STREQUAL "${quilt_MAJOR}.${quilt_MINOR}.${quilt_PATCH}")
  message(FATAL_ERROR "The text and the numbers of quilt/version.h differ")
endif()
set_property(DIRECTORY APPEND PROPERTY CMAKE_CONFIGURE_DEPENDS ${CMAKE_CURRENT_SOURCE_DIR}/quilt/version.h)

# SPDX-License-Identifier: Apache-2.0
# Debian ships MuPDF as a static library; what it needs in turn is linked here. Installed beside QuiltConfig.cmake too: who
# links the static platform library needs the same.

if(TARGET MuPDF::MuPDF)
  return()
endif()

find_library(MUPDF_LIBRARY mupdf REQUIRED)
find_library(MUPDF_THIRD_LIBRARY mupdf-third)
pkg_check_modules(MUPDF_NEEDS REQUIRED IMPORTED_TARGET freetype2 harfbuzz libjpeg zlib libopenjp2)
find_library(MUPDF_JBIG2_LIBRARY jbig2dec REQUIRED)
find_library(MUPDF_GUMBO_LIBRARY gumbo REQUIRED)
find_library(MUPDF_MUJS_LIBRARY mujs REQUIRED)

add_library(MuPDF::MuPDF INTERFACE IMPORTED)
target_link_libraries(MuPDF::MuPDF INTERFACE ${MUPDF_LIBRARY} PkgConfig::MUPDF_NEEDS ${MUPDF_JBIG2_LIBRARY}
                      ${MUPDF_GUMBO_LIBRARY} ${MUPDF_MUJS_LIBRARY})
if(MUPDF_THIRD_LIBRARY)
  target_link_libraries(MuPDF::MuPDF INTERFACE ${MUPDF_THIRD_LIBRARY})
endif()

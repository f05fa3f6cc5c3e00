# SPDX-License-Identifier: Apache-2.0
# Compiles the artwork, the string tables and the scripts of a folder into a library, so that nothing is looked up at run time.
# quilt/resources/EmbeddedFiles.h declares what comes out.

function(quilt_embed_resources target folder)
  file(GLOB_RECURSE files CONFIGURE_DEPENDS RELATIVE ${PROJECT_SOURCE_DIR}/${folder}
       ${PROJECT_SOURCE_DIR}/${folder}/artwork/*.png ${PROJECT_SOURCE_DIR}/${folder}/artwork/*.icns
       ${PROJECT_SOURCE_DIR}/${folder}/artwork/*.tif ${PROJECT_SOURCE_DIR}/${folder}/strings/*.strings
       ${PROJECT_SOURCE_DIR}/${folder}/scripting/*.js)
  list(SORT files)
  set(output ${PROJECT_BINARY_DIR}/generated/${target}.S)
  set(content "  .section .rodata\n")
  set(table "#include <array>\n\n#include \"${folder}/EmbeddedFiles.h\"\n\nextern \"C\" {\n")
  set(entries "")
  set(index 0)
  foreach(file ${files})
    string(APPEND content "  .global quilt_embedded_${index}, quilt_embedded_${index}_end\n"
                          "quilt_embedded_${index}:\n  .incbin \"${PROJECT_SOURCE_DIR}/${folder}/${file}\"\n"
                          "quilt_embedded_${index}_end:\n  .byte 0\n")
    string(APPEND table "extern const unsigned char quilt_embedded_${index}[];\n"
                        "extern const unsigned char quilt_embedded_${index}_end[];\n")
    string(APPEND entries "      {\"${file}\", {quilt_embedded_${index}, quilt_embedded_${index}_end}},\n")
    math(EXPR index "${index} + 1")
  endforeach()
  string(APPEND content "  .section .note.GNU-stack,\"\",@progbits\n")
  string(APPEND table "}\n\nnamespace quilt::resources {\n\nstd::span<const EmbeddedFile> embeddedFiles() {\n"
                      "  static const std::array<EmbeddedFile, ${index}> files{{\n${entries}  }};\n  return files;\n}\n\n}  // namespace quilt::resources\n")
  file(CONFIGURE OUTPUT ${output} CONTENT "${content}" @ONLY)
  file(CONFIGURE OUTPUT ${PROJECT_BINARY_DIR}/generated/${target}.cpp CONTENT "${table}" @ONLY)
  add_library(${target} STATIC ${output} ${PROJECT_BINARY_DIR}/generated/${target}.cpp)
  target_include_directories(${target} PUBLIC ${PROJECT_SOURCE_DIR})
  set(paths ${files})
  list(TRANSFORM paths PREPEND ${PROJECT_SOURCE_DIR}/${folder}/)
  set_source_files_properties(${output} PROPERTIES OBJECT_DEPENDS "${paths}")
endfunction()

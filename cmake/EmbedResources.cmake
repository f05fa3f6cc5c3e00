# SPDX-License-Identifier: Apache-2.0
# Compiles files of a folder (artwork, string tables, scripts) into a library, so that nothing is looked up at run time.
# quilt/resources/EmbeddedFiles.h declares the function that hands them out.

# quilt_embed_resources(target FOLDER FUNCTION PATTERN...)
function(quilt_embed_resources target folder function)
  list(TRANSFORM ARGN PREPEND ${PROJECT_SOURCE_DIR}/${folder}/ OUTPUT_VARIABLE patterns)
  file(GLOB_RECURSE files CONFIGURE_DEPENDS RELATIVE ${PROJECT_SOURCE_DIR}/${folder} ${patterns})
  list(SORT files)
  set(output ${PROJECT_BINARY_DIR}/generated/${target}.S)
  set(content "  .section .rodata\n")
  set(table "#include <array>\n\n#include \"${folder}/EmbeddedFiles.h\"\n\n#pragma GCC visibility push(hidden)\nextern \"C\" {\n")
  set(entries "")
  set(index 0)
  foreach(file ${files})
    set(symbol ${target}_${index})
    string(APPEND content "  .global ${symbol}, ${symbol}_end\n  .hidden ${symbol}, ${symbol}_end\n"
                          "${symbol}:\n  .incbin \"${PROJECT_SOURCE_DIR}/${folder}/${file}\"\n"
                          "${symbol}_end:\n  .byte 0\n")
    string(APPEND table "extern const unsigned char ${symbol}[];\n"
                        "extern const unsigned char ${symbol}_end[];\n")
    string(APPEND entries "      {\"${file}\", {${symbol}, ${symbol}_end}},\n")
    math(EXPR index "${index} + 1")
  endforeach()
  string(APPEND content "  .section .note.GNU-stack,\"\",@progbits\n")
  string(APPEND table "}\n#pragma GCC visibility pop\n\nnamespace quilt::resources {\n\nstd::span<const EmbeddedFile> ${function}() {\n"
                      "  static const std::array<EmbeddedFile, ${index}> files{{\n${entries}  }};\n  return files;\n}\n\n}  // namespace quilt::resources\n")
  file(CONFIGURE OUTPUT ${output} CONTENT "${content}" @ONLY)
  file(CONFIGURE OUTPUT ${PROJECT_BINARY_DIR}/generated/${target}.cpp CONTENT "${table}" @ONLY)
  add_library(${target} STATIC ${output} ${PROJECT_BINARY_DIR}/generated/${target}.cpp)
  target_include_directories(${target} PUBLIC ${PROJECT_SOURCE_DIR})
  set(paths ${files})
  list(TRANSFORM paths PREPEND ${PROJECT_SOURCE_DIR}/${folder}/)
  set_source_files_properties(${output} PROPERTIES OBJECT_DEPENDS "${paths}")
endfunction()

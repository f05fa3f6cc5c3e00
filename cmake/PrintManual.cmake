# SPDX-License-Identifier: Apache-2.0
cmake_minimum_required(VERSION 3.25)

# cmake -DPROGRAM=quilt -DFOLDER=folder -P PrintManual.cmake: manual pages and completions, as the program prints them.

function(print file)
  execute_process(COMMAND ${PROGRAM} help ${ARGN} OUTPUT_FILE ${FOLDER}/${file} COMMAND_ERROR_IS_FATAL ANY)
endfunction()

file(REMOVE_RECURSE ${FOLDER})
file(MAKE_DIRECTORY ${FOLDER}/man1)
execute_process(COMMAND ${PROGRAM} help OUTPUT_VARIABLE overview COMMAND_ERROR_IS_FATAL ANY)
string(REGEX REPLACE ".*\nCommands:(\n([ ]+[^\n]+\n)+).*" "\\1" table "${overview}")
string(REGEX MATCHALL "\n  [a-z]+" commands "${table}")
list(TRANSFORM commands REPLACE "[\n ]+" "")
if(NOT import IN_LIST commands OR NOT help IN_LIST commands)
  message(FATAL_ERROR "The commands are not where \"quilt help\" is expected to list them:\n${overview}")
endif()
print(man1/quilt.1 --as man)
foreach(command ${commands})
  print(man1/quilt-${command}.1 --as man ${command})
endforeach()
print(quilt.bash --as bash)
print(_quilt --as zsh)
print(quilt.fish --as fish)
file(TOUCH ${FOLDER}/stamp)

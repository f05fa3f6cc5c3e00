# SPDX-License-Identifier: Apache-2.0
# The headers that others include, by the library that they belong to: whole folders but the files named, which the
# folders keep to themselves. Run as a script (cmake -P) it prints them.

get_filename_component(root ${CMAKE_CURRENT_LIST_DIR}/.. ABSOLUTE)
set(quilt_public_headers_model quilt/quilt.h quilt/version.h quilt/scripting/Accessor.h)
foreach(folder platform/base platform/interfaces sources media themes documents collections hosts)
  if(CMAKE_SCRIPT_MODE_FILE)
    file(GLOB found RELATIVE ${root} ${root}/quilt/${folder}/*.h)
  else()
    file(GLOB found CONFIGURE_DEPENDS RELATIVE ${root} ${root}/quilt/${folder}/*.h)
  endif()
  list(APPEND quilt_public_headers_model ${found})
endforeach()
list(REMOVE_ITEM quilt_public_headers_model
     quilt/platform/base/ByteTable.h quilt/platform/base/MonitorWait.h quilt/documents/DataScript.h
     quilt/sources/DocumentSave.h quilt/sources/Grades.h quilt/sources/ModelFiles.h quilt/sources/RecordNames.h quilt/sources/RepeatedReport.h quilt/sources/SavedRecord.h)
set(quilt_public_headers_platform quilt/platform/install.h)
set(quilt_public_headers_bridge quilt/scripting/bridge/Bridge.h quilt/scripting/bridge/http/Limits.h)

if(CMAKE_SCRIPT_MODE_FILE)
  foreach(header ${quilt_public_headers_model} ${quilt_public_headers_platform} ${quilt_public_headers_bridge})
    execute_process(COMMAND ${CMAKE_COMMAND} -E echo ${header})
  endforeach()
endif()

# Code and documents generated from the schema of the API types.

find_package(Python3 3.11 REQUIRED COMPONENTS Interpreter)

set(KOVA_BINDING_SCHEMA ${PROJECT_SOURCE_DIR}/orbis/schema/binding.schema)
set(KOVA_API_SCHEMA ${PROJECT_SOURCE_DIR}/nox/schema/nox.schema)
set(KOVA_SCHEMA_TOOL ${PROJECT_SOURCE_DIR}/tools/schema/generate.py)
file(GLOB KOVA_SCHEMA_TOOL_FILES CONFIGURE_DEPENDS ${PROJECT_SOURCE_DIR}/tools/schema/*.py)

# kova_generate_types(MODULE SOURCES_VAR FILES... SCHEMAS ...): the C++ types of the last schema.
function(kova_generate_types module sources_var)
  cmake_parse_arguments(ARG "" "" "FILES;SCHEMAS" ${ARGN})
  set(out ${PROJECT_BINARY_DIR}/generated)
  set(sources)
  set(headers)
  foreach(file ${ARG_FILES})
    list(APPEND sources ${out}/${module}/${file}.cpp)
    list(APPEND headers ${out}/${module}/${file}.h)
  endforeach()
  if(NOT module STREQUAL "orbis")
    list(APPEND headers ${out}/${module}/Fwd.h)
  endif()
  # The generator leaves unchanged files alone, so a stamp says when it last ran.
  set(stamp ${out}/${module}.stamp)
  add_custom_command(OUTPUT ${stamp} BYPRODUCTS ${sources} ${headers}
    COMMAND ${CMAKE_COMMAND} -E make_directory ${out}
    COMMAND Python3::Interpreter -B ${KOVA_SCHEMA_TOOL} cpp ${module} ${out} ${ARG_SCHEMAS}
    COMMAND ${CMAKE_COMMAND} -E touch ${stamp}
    DEPENDS ${ARG_SCHEMAS} ${KOVA_SCHEMA_TOOL_FILES} VERBATIM
    COMMENT "Generating the types of ${module}")
  add_custom_target(${module}_types DEPENDS ${stamp})
  set(${sources_var} ${sources} PARENT_SCOPE)
endfunction()

# kova_generate_document(KIND FILE): one text of the whole API.
function(kova_generate_document kind file)
  set(path ${PROJECT_BINARY_DIR}/share/${file})
  add_custom_command(OUTPUT ${path}
    COMMAND ${CMAKE_COMMAND} -E make_directory ${PROJECT_BINARY_DIR}/share
    COMMAND Python3::Interpreter -B ${KOVA_SCHEMA_TOOL} ${kind} ${path} ${KOVA_BINDING_SCHEMA} ${KOVA_API_SCHEMA}
    COMMAND ${CMAKE_COMMAND} -E touch ${path}
    DEPENDS ${KOVA_BINDING_SCHEMA} ${KOVA_API_SCHEMA} ${KOVA_SCHEMA_TOOL_FILES} VERBATIM
    COMMENT "Generating ${file}")
  add_custom_target(nox_${kind} ALL DEPENDS ${path})
  install(FILES ${path} DESTINATION ${CMAKE_INSTALL_DATADIR}/kova)
endfunction()

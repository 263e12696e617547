# The commit of the sources, as a C++ text. Run as a script, it writes OUT, unless OUT says so already; included,
# it lets every build do that, so that a new commit compiles one file again.

if(CMAKE_SCRIPT_MODE_FILE)
  set(id "unknown")
  execute_process(COMMAND git -C ${SOURCE} rev-parse --show-toplevel
    OUTPUT_VARIABLE root OUTPUT_STRIP_TRAILING_WHITESPACE ERROR_QUIET RESULT_VARIABLE failed)
  if(NOT failed AND root STREQUAL SOURCE)  # and not a repository that the sources were only unpacked in
    execute_process(COMMAND git -C ${SOURCE} describe --always --dirty --abbrev=12 --exclude=*
      OUTPUT_VARIABLE described OUTPUT_STRIP_TRAILING_WHITESPACE ERROR_QUIET RESULT_VARIABLE failed)
    if(NOT failed)
      set(id ${described})
    endif()
  endif()
  set(text "\"${id}\"\n")
  if(EXISTS ${OUT})
    file(READ ${OUT} before)
  endif()
  if(NOT text STREQUAL "${before}")
    file(WRITE ${OUT} "${text}")
  endif()
  return()
endif()

set(KOVA_BUILD_ID_SCRIPT ${CMAKE_CURRENT_LIST_FILE})

# kova_generate_build_id(FILE TARGET): FILE is there, and right, before TARGET is built.
function(kova_generate_build_id file target)
  add_custom_target(${target}_build_id BYPRODUCTS ${file}
    COMMAND ${CMAKE_COMMAND} -D SOURCE=${PROJECT_SOURCE_DIR} -D OUT=${file} -P ${KOVA_BUILD_ID_SCRIPT}
    VERBATIM COMMENT "Looking which commit this is")
  add_dependencies(${target} ${target}_build_id)
  target_compile_definitions(${target} PRIVATE KOVA_VERSION="${PROJECT_VERSION}")
endfunction()

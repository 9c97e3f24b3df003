# Compiles two one-line translation units with the include path of one
# platform layer: one including a header of that layer, which must compile,
# and one including a header of a layer it may not see (above it or beside
# it), which must fail because the header is not found.
#
#   cmake -DCXX=... -DINCLUDES="dir|dir..." -DOWN=Header.h -DREFUSED=Header.h
#         -DWORK=dir -P check-layer-include.cmake
foreach(var CXX INCLUDES OWN REFUSED WORK)
  if(NOT DEFINED ${var})
    message(FATAL_ERROR "check-layer-include: ${var} is not set")
  endif()
endforeach()

string(REPLACE "|" ";" dirs "${INCLUDES}")
set(flags -std=c++17 -fsyntax-only)
foreach(dir IN LISTS dirs)
  list(APPEND flags "-I${dir}")
endforeach()
file(MAKE_DIRECTORY "${WORK}")

function(compile name header result_var output_var)
  set(source "${WORK}/${name}.cpp")
  file(WRITE "${source}" "#include \"${header}\"\n")
  execute_process(COMMAND "${CXX}" ${flags} "${source}" RESULT_VARIABLE result
                  OUTPUT_VARIABLE output ERROR_VARIABLE output)
  set(${result_var} "${result}" PARENT_SCOPE)
  set(${output_var} "${output}" PARENT_SCOPE)
endfunction()

compile(own "${OWN}" result output)
if(NOT result EQUAL 0)
  message(FATAL_ERROR "the layer's own header ${OWN} does not compile with its include path:\n"
                      "${output}")
endif()

compile(above "${REFUSED}" result output)
if(result EQUAL 0)
  message(FATAL_ERROR "${REFUSED}, of a layer it may not see, compiles with this layer's include path")
endif()
string(REGEX MATCH "${REFUSED}[^\n]*(No such file|not found)" missing "${output}")
if(NOT missing)
  message(FATAL_ERROR "${REFUSED} failed for another reason than not being found:\n${output}")
endif()
message(STATUS "${REFUSED} is refused; ${OWN} compiles")

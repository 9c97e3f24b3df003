# Finds what the Python module needs: a Python 3 interpreter with its headers,
# and pybind11. Sets LUM_PYTHON_FOUND. Included by the top-level CMakeLists
# before the LUM_BUILD_PYTHON option, whose default depends on it.
#
# The module's tests run with the interpreter found here, so an interpreter
# that can import pytest is preferred: the first python3 on PATH (a version
# manager's shim, say) may lack the packages that .ci/install-deps installs
# for the system one. -DPython3_EXECUTABLE=... overrides the choice.
if(NOT DEFINED Python3_EXECUTABLE)
  find_program(LUM_PYTHON_ON_PATH NAMES python3 NO_CACHE)
  foreach(candidate IN ITEMS "${LUM_PYTHON_ON_PATH}" /usr/bin/python3)
    if(candidate AND EXISTS "${candidate}")
      execute_process(COMMAND "${candidate}" -c "import pytest"
                      RESULT_VARIABLE lum_python_rc OUTPUT_QUIET ERROR_QUIET)
      if(lum_python_rc EQUAL 0)
        set(Python3_EXECUTABLE "${candidate}" CACHE FILEPATH "Python 3 interpreter")
        break()
      endif()
    endif()
  endforeach()
endif()
find_package(Python3 COMPONENTS Interpreter Development.Module QUIET)
if(Python3_FOUND)
  find_package(pybind11 CONFIG QUIET)
endif()
if(Python3_FOUND AND pybind11_FOUND)
  set(LUM_PYTHON_FOUND TRUE)
else()
  set(LUM_PYTHON_FOUND FALSE)
endif()

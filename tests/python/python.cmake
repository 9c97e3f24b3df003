# The Python module's tests (pytest, with a hypothesis state machine), run
# from the build tree's package folder. Included by tests/CMakeLists.txt.
if(TARGET lumtdm_python)
  add_test(NAME LumTdmPython.pytest
           COMMAND ${Python3_EXECUTABLE} -m pytest -q -p no:cacheprovider
                   ${CMAKE_CURRENT_LIST_DIR}
           WORKING_DIRECTORY ${CMAKE_CURRENT_BINARY_DIR})
  set(lum_python_test_env PYTHONPATH=${PROJECT_BINARY_DIR}/python PYTHONDONTWRITEBYTECODE=1)
  if(TARGET tdm)
    list(APPEND lum_python_test_env LUMTDM_TDM=$<TARGET_FILE:tdm>)
  endif()
  # An instrumented module needs the sanitizer runtime loaded first, and the
  # C++ runtime with it (the interpreter has none, and the sanitizer must see
  # its throw to intercept it); the interpreter's own allocations are not
  # ours to leak-check.
  if(CMAKE_CXX_FLAGS MATCHES "-fsanitize=[^ ]*address")
    execute_process(COMMAND ${CMAKE_CXX_COMPILER} -print-file-name=libasan.so
                    OUTPUT_VARIABLE lum_asan_runtime OUTPUT_STRIP_TRAILING_WHITESPACE)
    execute_process(COMMAND ${CMAKE_CXX_COMPILER} -print-file-name=libstdc++.so
                    OUTPUT_VARIABLE lum_cxx_runtime OUTPUT_STRIP_TRAILING_WHITESPACE)
    set(lum_preload "${lum_asan_runtime} ${lum_cxx_runtime}")
    list(APPEND lum_python_test_env "LD_PRELOAD=${lum_preload}"
         ASAN_OPTIONS=detect_leaks=0:halt_on_error=1:abort_on_error=1)
    set_property(TEST LumTdmInstall.FindPackageAndPkgConfig APPEND PROPERTY ENVIRONMENT
                 "LUM_PYTHON_PRELOAD=${lum_preload}")
  endif()
  set_tests_properties(LumTdmPython.pytest PROPERTIES ENVIRONMENT "${lum_python_test_env}"
                       TIMEOUT 600)
  # The install test imports the installed module with the same interpreter.
  set_property(TEST LumTdmInstall.FindPackageAndPkgConfig APPEND PROPERTY ENVIRONMENT
               LUM_PYTHON=${Python3_EXECUTABLE})
else()
  add_test(NAME LumTdmPython.pytest
           COMMAND sh -c "echo 'SKIPPED: the Python module lumtdm was not built (LUM_BUILD_PYTHON is off, or pybind11-dev / python3-dev are missing: bash .ci/install-deps)'; exit 77")
  set_tests_properties(LumTdmPython.pytest PROPERTIES SKIP_RETURN_CODE 77)
endif()

# The generator: SWIG_EXECUTABLE, of a version that the module's frame is tested with. The frame mends
# the runtime that the generator writes into the module, and another version may write another one; the
# module looks at its import whether its fixes took hold, whatever made it.
#
# As a script it only looks: cmake -D SWIG_EXECUTABLE=... -P Generator.cmake

cmake_minimum_required(VERSION 3.25)

set(SWIG_TESTED_VERSIONS 4.1)
option(ALLOW_UNTESTED_SWIG "Generate with a version of SWIG that the module is not tested with" OFF)

find_program(SWIG_EXECUTABLE NAMES swig4.1 swig4.0 swig REQUIRED)

execute_process(COMMAND "${SWIG_EXECUTABLE}" -version
  OUTPUT_VARIABLE swig_words ERROR_VARIABLE swig_words RESULT_VARIABLE swig_status)
if(NOT swig_status EQUAL 0 OR NOT swig_words MATCHES "SWIG Version ([0-9]+\\.[0-9]+)(\\.[0-9]+)?")
  message(FATAL_ERROR "${SWIG_EXECUTABLE} does not say which version of SWIG it is")
endif()
set(swig_version "${CMAKE_MATCH_1}${CMAKE_MATCH_2}")
set(swig_series "${CMAKE_MATCH_1}")

if(NOT swig_series IN_LIST SWIG_TESTED_VERSIONS)
  list(JOIN SWIG_TESTED_VERSIONS ".x, " swig_tested)
  set(swig_untested "${SWIG_EXECUTABLE} is SWIG ${swig_version}; the module is tested with SWIG \
${swig_tested}.x only, whose runtime it mends (docs/development/overrides.md).")
  if(ALLOW_UNTESTED_SWIG)
    message(WARNING "${swig_untested}")
  else()
    message(FATAL_ERROR "${swig_untested} Name another with -DSWIG_EXECUTABLE=PATH, or pass \
-DALLOW_UNTESTED_SWIG=ON to try this one.")
  endif()
endif()

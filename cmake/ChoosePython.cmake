# The interpreter that the module is built for: Debian's own unless -DPython3_EXECUTABLE names another.
# Whatever python3 comes first in PATH is ignored on purpose: it may lack headers or shared packages.

if(NOT Python3_EXECUTABLE AND EXISTS /usr/bin/python3)
  set(Python3_EXECUTABLE /usr/bin/python3 CACHE FILEPATH "The interpreter to build for")
endif()
find_package(Python3 3.8 REQUIRED COMPONENTS Interpreter Development.Module)

# The two libraries of a host that is already there, under the target names of the simulated ones.

foreach(name IN ITEMS vswitch nebPublic)
  set(file "${HOST_LIBRARY_DIR}/lib${name}.so")
  if(NOT EXISTS "${file}")
    message(FATAL_ERROR "HOST_LIBRARY_DIR: ${file} does not exist")
  endif()
  add_library(${name} SHARED IMPORTED GLOBAL)
  set_target_properties(${name} PROPERTIES
    IMPORTED_LOCATION "${file}" IMPORTED_SONAME "lib${name}.so")
endforeach()

# -DSANITIZE=address,undefined instruments everything that is built here.

set(SANITIZE "" CACHE STRING "Sanitizers to build with, for example address,undefined")
if(SANITIZE)
  add_compile_options(-fsanitize=${SANITIZE} -fno-sanitize-recover=all -fno-omit-frame-pointer -g)
  # Left out: vptr would want the type information of classes that a library keeps to itself; enum
  # stops at a value that no enumerator has, which callers in C may pass and the host must refuse.
  add_compile_options($<$<COMPILE_LANGUAGE:CXX>:-fno-sanitize=vptr,enum>)
  add_link_options(-fsanitize=${SANITIZE})
endif()

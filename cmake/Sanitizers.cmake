# -DSANITIZE=address,undefined instruments everything that is built here.

set(SANITIZE "" CACHE STRING "Sanitizers to build with, for example address,undefined")
if(SANITIZE)
  add_compile_options(-fsanitize=${SANITIZE} -fno-sanitize-recover=all -fno-omit-frame-pointer -g)
  # It would want the type information of classes that a library keeps to itself.
  add_compile_options($<$<COMPILE_LANGUAGE:CXX>:-fno-sanitize=vptr>)
  add_link_options(-fsanitize=${SANITIZE})
endif()

# `warnings`: what every target of ours is compiled with. A warning is an error.

add_library(warnings INTERFACE)
target_compile_options(warnings INTERFACE -Wall -Wextra -Werror)

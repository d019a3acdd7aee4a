# Compiler warnings for the project's own targets: link vrx_warnings PRIVATE.
add_library(vrx_warnings INTERFACE)
target_compile_options(vrx_warnings INTERFACE -Wall -Wextra -Wpedantic)
if(VRX_WERROR)
  target_compile_options(vrx_warnings INTERFACE -Werror)
endif()

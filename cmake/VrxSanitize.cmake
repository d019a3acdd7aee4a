# AddressSanitizer + UndefinedBehaviorSanitizer for every target of the build,
# so that the libraries and the tests that call them are instrumented alike.
if(VRX_SANITIZE)
  set(_vrx_san -fsanitize=address,undefined -fno-sanitize-recover=all -fno-omit-frame-pointer)
  add_compile_options(${_vrx_san})
  add_link_options(${_vrx_san})
endif()

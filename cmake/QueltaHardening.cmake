# quelta_harden(TARGET): adds the hardening flags of a release build if QUELTA_HARDEN is on.
function(quelta_harden target)
  if(NOT QUELTA_HARDEN)
    return()
  endif()
  target_compile_options(${target} PRIVATE
    -U_FORTIFY_SOURCE -D_FORTIFY_SOURCE=2 -D_GLIBCXX_ASSERTIONS -fstack-protector-strong)
  get_target_property(type ${target} TYPE)
  if(type STREQUAL "EXECUTABLE")
    target_link_options(${target} PRIVATE -pie -Wl,-z,relro,-z,now)
  endif()
endfunction()

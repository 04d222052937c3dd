# quelta_sanitize(TARGET): adds the sanitizers in QUELTA_SANITIZE to the target, if any.
function(quelta_sanitize target)
  if(NOT QUELTA_SANITIZE)
    return()
  endif()
  target_compile_options(${target} PRIVATE
    -fsanitize=${QUELTA_SANITIZE} -fno-sanitize-recover=all -fno-omit-frame-pointer)
  target_link_options(${target} PRIVATE -fsanitize=${QUELTA_SANITIZE})
endfunction()

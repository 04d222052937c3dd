# quelta_sanitize(TARGET): instruments the target as QUELTA_SANITIZE says; nothing when it is empty.
function(quelta_sanitize target)
  if(NOT QUELTA_SANITIZE)
    return()
  endif()
  target_compile_options(${target} PRIVATE
    -fsanitize=${QUELTA_SANITIZE} -fno-sanitize-recover=all -fno-omit-frame-pointer)
  target_link_options(${target} PRIVATE -fsanitize=${QUELTA_SANITIZE})
endfunction()

# quelta_warnings(TARGET): enables the project's warnings; they are errors if QUELTA_WERROR is on.
function(quelta_warnings target)
  target_compile_options(${target} PRIVATE
    -Wall -Wextra -Wconversion -Wshadow -Wnon-virtual-dtor -Wold-style-cast -Wundef -Wvla
    -Wformat=2
    # gcc's -Wpedantic rejects the "%m" of the logging calls.
    $<$<CXX_COMPILER_ID:Clang>:-Wpedantic>
    $<$<BOOL:${QUELTA_WERROR}>:-Werror>
    # Makes assertions print a path relative to the project, the same on every machine.
    -fmacro-prefix-map=${PROJECT_SOURCE_DIR}/=)
endfunction()

# quelta_warnings(TARGET): the project's one list of warnings, errors when QUELTA_WERROR is on.
function(quelta_warnings target)
  target_compile_options(${target} PRIVATE
    -Wall -Wextra -Wconversion -Wshadow -Wnon-virtual-dtor -Wold-style-cast -Wundef -Wvla
    -Wformat=2
    # gcc's -Wpedantic refuses the "%m" of the logging calls.
    $<$<CXX_COMPILER_ID:Clang>:-Wpedantic>
    $<$<BOOL:${QUELTA_WERROR}>:-Werror>
    # Assertions print a path relative to the project, the same on every machine.
    -fmacro-prefix-map=${PROJECT_SOURCE_DIR}/=)
endfunction()

# Warnings for the project's own code, errors on warnings.
function(vrx_warnings target)
  target_compile_options(${target} PRIVATE -Wall -Wextra -Wpedantic -Werror)
endfunction()

# Warnings every target of the project builds clean with.
function(tarn_warnings target)
  target_compile_options(${target} PRIVATE -Wall -Wextra -Wno-unknown-pragmas)
  if(TARN_WERROR)
    target_compile_options(${target} PRIVATE -Werror)
  endif()
endfunction()

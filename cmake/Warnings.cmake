# Every target of this project is built with these. Only those who work on it want an error of each:
# another compiler or another optimisation warns of other things.
add_compile_options(-Wall -Wextra -Wpedantic -Wshadow -Wconversion
  -Wnon-virtual-dtor -Wold-style-cast -Woverloaded-virtual -Wredundant-decls)
if(CMAKE_CXX_COMPILER_ID STREQUAL "Clang")
  add_compile_options(-Wreserved-identifier)
endif()
option(SECPOLICY_WERROR "Treat warnings as errors" OFF)
if(SECPOLICY_WERROR)
  add_compile_options(-Werror)
  # GCC takes the functions of a precompiled header for the program's own, and is wrong about them.
  if(SECPOLICY_PRECOMPILE AND CMAKE_CXX_COMPILER_ID STREQUAL "GNU")
    add_compile_options(-Wno-error=array-bounds -Wno-error=maybe-uninitialized -Wno-error=restrict
      -Wno-error=stringop-overflow -Wno-error=stringop-overread)
  endif()
endif()

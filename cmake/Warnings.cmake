# Every target of this project is built with these. Only those who work on it want an error of each:
# another compiler or another optimisation warns of other things.
add_compile_options(-Wall -Wextra -Wpedantic -Wshadow -Wconversion
  -Wnon-virtual-dtor -Wold-style-cast -Woverloaded-virtual)
option(SECPOLICY_WERROR "Treat warnings as errors" OFF)
if(SECPOLICY_WERROR)
  add_compile_options(-Werror)
endif()

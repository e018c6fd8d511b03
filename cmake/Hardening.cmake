# What a library that decides over other programs' rights is built with, in every configuration.
include(CheckPIESupported)
check_pie_supported()
add_compile_options(-fstack-protector-strong)
add_link_options(-Wl,-z,relro -Wl,-z,now)

# Fortification needs the optimiser and is at odds with the sanitizers. A level that was asked for,
# by a distribution for one, stays.
add_compile_options(-D_GLIBCXX_ASSERTIONS)
set(given_flags "${CMAKE_CXX_FLAGS} ${CMAKE_CXX_FLAGS_RELEASE} ${CMAKE_CXX_FLAGS_RELWITHDEBINFO}")
if(NOT given_flags MATCHES "_FORTIFY_SOURCE")
  add_compile_options("$<$<CONFIG:Release,RelWithDebInfo>:-D_FORTIFY_SOURCE=2>")
endif()

# A library brings all that it needs. Of the sanitizers of clang it does not: their runtime is part of
# the program.
function(refuse_undefined_symbols library)
  if(NOT (SECPOLICY_SANITIZE AND CMAKE_CXX_COMPILER_ID STREQUAL "Clang"))
    target_link_options(${library} PRIVATE LINKER:--no-undefined)
  endif()
endfunction()

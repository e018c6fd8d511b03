# What a library that decides over other programs' rights is built with, in every configuration.
include(CheckPIESupported)
check_pie_supported()
add_compile_options(-fstack-protector-strong)
add_link_options(-Wl,-z,relro -Wl,-z,now)

# Fortification needs the optimiser and is at odds with the sanitizers.
add_compile_options("$<$<CONFIG:Release,RelWithDebInfo>:-D_FORTIFY_SOURCE=2>" -D_GLIBCXX_ASSERTIONS)

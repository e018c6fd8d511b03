# Every target of this project is built with these; a warning is an error.
add_compile_options(-Wall -Wextra -Wpedantic -Wshadow -Wconversion -Werror)

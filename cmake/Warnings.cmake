add_library(orva_warnings INTERFACE)
target_compile_options(orva_warnings INTERFACE
    -Wall -Wextra -Wpedantic -Wconversion -Wshadow -Wnon-virtual-dtor -Werror)

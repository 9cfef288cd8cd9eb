# One interface target carries the flags that all of our own code is compiled with.
add_library(kelo_flags INTERFACE)
target_compile_options(kelo_flags INTERFACE -Wall -Wextra -Wconversion -Wformat-security)
if(KELO_WERROR)
    target_compile_options(kelo_flags INTERFACE -Werror)
endif()
if(KELO_SANITIZE)
    add_compile_options(-fsanitize=${KELO_SANITIZE} -fno-omit-frame-pointer -fno-sanitize-recover=all)
    add_link_options(-fsanitize=${KELO_SANITIZE})
endif()
if(KELO_BUILD_FUZZ)
    # The libraries too report their coverage to libFuzzer.
    add_compile_options(-fsanitize=fuzzer-no-link)
endif()

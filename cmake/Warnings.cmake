# Compiler warnings and sanitizers shared by every target of the project.

function(zal_target_warnings target)
    target_compile_options(${target} PRIVATE
        -Wall -Wextra -Wpedantic -Wformat=2 -Wno-format-nonliteral)
    if(ZAL_WERROR)
        target_compile_options(${target} PRIVATE -Werror)
    endif()
endfunction()

if(ZAL_SANITIZE STREQUAL "address")
    add_compile_options(-fsanitize=address,undefined -fno-omit-frame-pointer -fno-sanitize-recover=undefined)
    add_link_options(-fsanitize=address,undefined)
elseif(ZAL_SANITIZE STREQUAL "thread")
    add_compile_options(-fsanitize=thread -fno-omit-frame-pointer)
    add_link_options(-fsanitize=thread)
elseif(NOT ZAL_SANITIZE STREQUAL "")
    message(FATAL_ERROR "ZAL_SANITIZE must be address, thread or empty, not '${ZAL_SANITIZE}'")
endif()

if(PARVEL_SANITIZE)
    add_compile_options(-fsanitize=${PARVEL_SANITIZE} -fno-omit-frame-pointer
        -fno-sanitize-recover=all)
    add_link_options(-fsanitize=${PARVEL_SANITIZE})
    # GCC 12 reports these within the standard library once sanitizers change its inlining.
    add_compile_options(-Wno-maybe-uninitialized -Wno-stringop-overflow)
endif()

if(PARVEL_SANITIZE)
    add_compile_options(-fsanitize=${PARVEL_SANITIZE} -fno-omit-frame-pointer
        -fno-sanitize-recover=all)
    add_link_options(-fsanitize=${PARVEL_SANITIZE})
    # GCC 12 reports the first two within the standard library once sanitizers change its inlining;
    # the last is for one source file by itself, and these builds merge several into one.
    add_compile_options(-Wno-maybe-uninitialized -Wno-stringop-overflow -Wno-shadow)
endif()

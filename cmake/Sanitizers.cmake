if(PARVEL_SANITIZE)
    add_compile_options(-fsanitize=${PARVEL_SANITIZE} -fno-omit-frame-pointer
        -fno-sanitize-recover=all)
    add_link_options(-fsanitize=${PARVEL_SANITIZE})
    # Warnings are held by the other builds: GCC 12 finds faults within the standard library once
    # sanitizers change its inlining, and these builds merge several source files into one.
    add_compile_options(-w)
endif()

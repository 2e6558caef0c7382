find_package(PkgConfig REQUIRED)
pkg_check_modules(LIBZIP REQUIRED IMPORTED_TARGET libzip)
pkg_check_modules(LIBDEFLATE REQUIRED IMPORTED_TARGET libdeflate)
pkg_check_modules(LIBXML2 REQUIRED IMPORTED_TARGET libxml-2.0)
pkg_check_modules(LIBICUUC REQUIRED IMPORTED_TARGET icu-uc)
pkg_check_modules(LIBICUI18N REQUIRED IMPORTED_TARGET icu-i18n)
pkg_check_modules(LIBISAL REQUIRED IMPORTED_TARGET libisal)
pkg_check_modules(LIBCRYPTO REQUIRED IMPORTED_TARGET libcrypto)
pkg_check_modules(LIBSYSTEMD REQUIRED IMPORTED_TARGET libsystemd)
find_package(Threads REQUIRED)

# Libraries that are loaded when they are first used, so that no start pays for them: nothing is
# linked with them. What is loaded goes by the soname of the library whose headers are compiled
# against.
function(parvel_find_soname name)
    list(GET ${name}_LINK_LIBRARIES 0 file)
    execute_process(COMMAND ${CMAKE_READELF} --dynamic ${file}
        OUTPUT_VARIABLE dynamic COMMAND_ERROR_IS_FATAL ANY)
    if(NOT dynamic MATCHES "\\(SONAME\\)[^[]*\\[([^]]+)\\]")
        message(FATAL_ERROR "${file} has no soname")
    endif()
    set(${name}_SONAME ${CMAKE_MATCH_1} PARENT_SCOPE)
    # An upgrade may bring another soname.
    set_property(DIRECTORY APPEND PROPERTY CMAKE_CONFIGURE_DEPENDS ${file})
endfunction()
foreach(library LIBCRYPTO LIBICUI18N LIBISAL LIBSYSTEMD LIBZIP)
    parvel_find_soname(${library})
endforeach()

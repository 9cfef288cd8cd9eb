# kelo_library(NAME MAP FILE): a shared library with a SONAME, hidden symbols, and an export map that names what stays visible.
# Its headers are those of include/NAME; with the tests each is compiled alone.
#
# -Bsymbolic stays off on purpose: a program may define a platform function itself and so replace the library's.
function(kelo_library name)
    cmake_parse_arguments(ARG "" "MAP" "" ${ARGN})
    add_library(${name} SHARED)
    add_library(kelosyslog::${name} ALIAS ${name})
    target_link_libraries(${name} PUBLIC $<BUILD_INTERFACE:kelo_flags>)
    file(GLOB headers CONFIGURE_DEPENDS ${PROJECT_SOURCE_DIR}/include/${name}/*.h)
    target_sources(${name} PUBLIC FILE_SET HEADERS BASE_DIRS ${PROJECT_SOURCE_DIR}/include FILES ${headers})
    target_compile_features(${name} PUBLIC cxx_std_20)
    set_target_properties(${name} PROPERTIES
        VERSION ${PROJECT_VERSION} SOVERSION ${PROJECT_VERSION_MAJOR}
        CXX_VISIBILITY_PRESET hidden VISIBILITY_INLINES_HIDDEN ON
        INSTALL_RPATH "$ORIGIN" BUILD_WITH_INSTALL_RPATH ON # the libraries find each other in any prefix
        LINK_DEPENDS ${ARG_MAP})
    target_link_options(${name} PRIVATE -Wl,--version-script=${ARG_MAP})
    if(NOT KELO_SANITIZE)
        target_link_options(${name} PRIVATE -Wl,--no-undefined)
    endif()
    install(TARGETS ${name} EXPORT kelosyslog-targets LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR} FILE_SET HEADERS)
    if(KELO_BUILD_TESTS)
        set_target_properties(${name} PROPERTIES VERIFY_INTERFACE_HEADER_SETS ON)
        add_custom_target(${name}_headers ALL)
        add_dependencies(${name}_headers ${name}_verify_interface_header_sets)
    endif()
endfunction()

# kelo_library(NAME MAP FILE): a shared library with a SONAME, hidden symbols, and an export map that names what stays visible.
#
# -Bsymbolic stays off on purpose: a program may define a platform function itself and so replace the library's.
function(kelo_library name)
    cmake_parse_arguments(ARG "" "MAP" "" ${ARGN})
    add_library(${name} SHARED)
    add_library(kelosyslog::${name} ALIAS ${name})
    target_link_libraries(${name} PRIVATE $<BUILD_INTERFACE:kelo_flags>)
    target_include_directories(${name} PUBLIC $<BUILD_INTERFACE:${PROJECT_SOURCE_DIR}/include>
                                              $<INSTALL_INTERFACE:${CMAKE_INSTALL_INCLUDEDIR}>)
    target_compile_features(${name} PUBLIC cxx_std_20)
    set_target_properties(${name} PROPERTIES
        VERSION ${PROJECT_VERSION} SOVERSION ${PROJECT_VERSION_MAJOR}
        CXX_VISIBILITY_PRESET hidden VISIBILITY_INLINES_HIDDEN ON
        INSTALL_RPATH "$ORIGIN" # the libraries find each other in any prefix
        LINK_DEPENDS ${ARG_MAP})
    target_link_options(${name} PRIVATE -Wl,--version-script=${ARG_MAP})
    if(NOT KELO_SANITIZE)
        target_link_options(${name} PRIVATE -Wl,--no-undefined)
    endif()
    install(TARGETS ${name} EXPORT kelosyslog-targets LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR})
endfunction()

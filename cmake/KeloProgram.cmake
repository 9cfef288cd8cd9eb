# kelo_install_program(TARGET): installs the program. By one run path it finds the libraries in any prefix and in the build tree. CMake would
# pad a run path of the build tree with colons, to have room for another one: each is the current folder, where the loader would
# look for every library first.
function(kelo_install_program target)
    file(RELATIVE_PATH libraries ${CMAKE_INSTALL_FULL_BINDIR} ${CMAKE_INSTALL_FULL_LIBDIR})
    set_target_properties(${target} PROPERTIES INSTALL_RPATH "$ORIGIN/${libraries}" BUILD_WITH_INSTALL_RPATH ON)
    install(TARGETS ${target} RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR})
endfunction()

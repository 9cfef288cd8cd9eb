option(KELO_UNITY "Compile the sources of each folder as one, and the header of the tests once: a whole build takes half the time; not for developing" OFF)

# kelo_unity(TARGET): with KELO_UNITY, one compilation for each folder of the target's sources. So a name in an unnamed namespace
# is unique within its folder, or the build of the packages fails. Called when all sources are known.
function(kelo_unity target)
    if(NOT KELO_UNITY)
        return()
    endif()
    get_target_property(sources ${target} SOURCES)
    foreach(source IN LISTS sources)
        cmake_path(GET source PARENT_PATH folder)
        string(MAKE_C_IDENTIFIER "folder_${folder}" group)
        set_property(SOURCE ${source} TARGET_DIRECTORY ${target} PROPERTY UNITY_GROUP ${group})
    endforeach()
    set_target_properties(${target} PROPERTIES UNITY_BUILD ON UNITY_BUILD_MODE GROUP)
endfunction()

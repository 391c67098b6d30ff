# Compiler settings that every target of the project links as `project_options`.
add_library(project_options INTERFACE)

target_compile_options(project_options INTERFACE
    -Wall -Wextra -Wconversion
    # The same arithmetic in every build: no fused multiply-add unless it is written.
    -ffp-contract=off
    # Typed views of byte arrays are part of the attribute model.
    -fno-strict-aliasing)

if(SCENE_WARNINGS_AS_ERRORS)
    target_compile_options(project_options INTERFACE -Werror)
endif()

if(SCENE_SANITIZE)
    set(sanitizers -fsanitize=address,undefined,float-cast-overflow -fno-sanitize-recover=all)
    target_compile_options(project_options INTERFACE ${sanitizers} -fno-omit-frame-pointer)
    target_link_options(project_options INTERFACE ${sanitizers})
endif()

# Modules export their two entry points alone, whatever the libraries inside them hold.
function(scene_plugin_module target)
    set_target_properties(${target} PROPERTIES PREFIX "")
    target_link_options(${target} PRIVATE
        -Wl,--exclude-libs,ALL
        -Wl,--version-script=${CMAKE_SOURCE_DIR}/cmake/plugin.map)
    set_target_properties(${target} PROPERTIES LINK_DEPENDS ${CMAKE_SOURCE_DIR}/cmake/plugin.map)
    if(NOT SCENE_SANITIZE)
        target_link_options(${target} PRIVATE -Wl,--no-undefined)
    endif()
endfunction()

# check_headers(<target> <header>...): with SCENE_CHECK_HEADERS, compiles each header alone with
# the settings of the target, so that none leans on what was included before it.
function(check_headers target)
    if(NOT SCENE_CHECK_HEADERS)
        return()
    endif()
    set(sources)
    foreach(header IN LISTS ARGN)
        string(MAKE_C_IDENTIFIER "${target}_${header}" name)
        set(source ${CMAKE_BINARY_DIR}/header_checks/${name}.cpp)
        file(CONFIGURE OUTPUT ${source} CONTENT "#include \"${CMAKE_CURRENT_SOURCE_DIR}/${header}\"\n")
        list(APPEND sources ${source})
    endforeach()
    add_library(check_headers_${target} OBJECT ${sources})
    target_link_libraries(check_headers_${target} PRIVATE ${target} project_options)
    target_include_directories(check_headers_${target} PRIVATE
        $<TARGET_PROPERTY:${target},INCLUDE_DIRECTORIES>)
endfunction()

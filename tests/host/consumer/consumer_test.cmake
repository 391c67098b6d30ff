# Installs the build tree BUILD below WORK and builds the examples against that, by CMake's package
# and by pkg-config; the programs must run and write a file.
function(run)
    execute_process(COMMAND ${ARGN} COMMAND_ERROR_IS_FATAL ANY OUTPUT_QUIET)
endfunction()

file(REMOVE_RECURSE ${WORK})
set(prefix ${WORK}/prefix)
run(${CMAKE_COMMAND} --install ${BUILD} --prefix ${prefix})

# The link in bin leads to the program and its plugins.
file(WRITE ${WORK}/model.obj "v 0 0 0\nv 1 0 0\nv 0 1 0\nf 1 2 3\n")
run(${prefix}/bin/scene_export --quiet ${WORK}/model.obj ${WORK}/model.glb)

run(${CMAKE_COMMAND} -S ${CMAKE_CURRENT_LIST_DIR} -B ${WORK}/build -DCMAKE_PREFIX_PATH=${prefix}
    -DCMAKE_CXX_COMPILER=${COMPILER} -DCMAKE_CXX_FLAGS=${FLAGS} -DEXAMPLES=${EXAMPLES})
run(${CMAKE_COMMAND} --build ${WORK}/build)
file(READ ${WORK}/build/plugin_folder plugins)
run(${WORK}/build/minimal_host ${plugins} ${WORK}/package.gltf)

file(GLOB_RECURSE pc ${prefix}/*/scene_export.pc)
cmake_path(GET pc PARENT_PATH pc_folder)
set(ENV{PKG_CONFIG_PATH} ${pc_folder})
find_package(PkgConfig REQUIRED)
execute_process(COMMAND ${PKG_CONFIG_EXECUTABLE} --cflags --libs scene_export
    OUTPUT_VARIABLE flags OUTPUT_STRIP_TRAILING_WHITESPACE COMMAND_ERROR_IS_FATAL ANY)
separate_arguments(flags UNIX_COMMAND "${flags}")
run(${COMPILER} ${EXAMPLES}/minimal_host.cpp -o ${WORK}/minimal_host ${FLAGS} ${flags})
run(${WORK}/minimal_host ${plugins} ${WORK}/pkg_config.gltf)

foreach(name package pkg_config)
    file(READ ${WORK}/${name}.gltf text)
    if(NOT text MATCHES "\"asset\"")
        message(FATAL_ERROR "${name}.gltf was not written")
    endif()
endforeach()

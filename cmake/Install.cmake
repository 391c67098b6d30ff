# What `cmake --install` puts where: the program with its libraries, plugins and their order in one
# folder, since it looks for them beside itself; a link to it in bin; headers, and what other
# projects find them by.
include(CMakePackageConfigHelpers)
include(GNUInstallDirs)

set(program_folder ${CMAKE_INSTALL_LIBDIR}/scene_export)
set(package_folder ${CMAKE_INSTALL_LIBDIR}/cmake/scene_export)
set(header_folder ${CMAKE_INSTALL_INCLUDEDIR}/scene_export)

install(TARGETS scene_export RUNTIME DESTINATION ${program_folder})
install(TARGETS scene_gltf scene_assimp LIBRARY DESTINATION ${program_folder})
install(FILES ${CMAKE_SOURCE_DIR}/host/importers.txt DESTINATION ${program_folder})
file(RELATIVE_PATH program_link /${CMAKE_INSTALL_BINDIR} /${program_folder}/scene_export)
install(CODE "
    set(folder \"\$ENV{DESTDIR}\${CMAKE_INSTALL_PREFIX}/${CMAKE_INSTALL_BINDIR}\")
    file(MAKE_DIRECTORY \"\${folder}\")
    file(CREATE_LINK ${program_link} \"\${folder}/scene_export\" SYMBOLIC)
    message(STATUS \"Linked: \${folder}/scene_export\")")

# For other projects.
target_compile_features(base1 PUBLIC cxx_std_20)
install(TARGETS base1 scene EXPORT scene_export_targets
    LIBRARY DESTINATION ${program_folder}
    ARCHIVE DESTINATION ${program_folder})
install(DIRECTORY base/include/ scene/include/ DESTINATION ${header_folder}
    FILES_MATCHING PATTERN "*.h")
install(EXPORT scene_export_targets NAMESPACE scene_export:: DESTINATION ${package_folder})
configure_package_config_file(
    ${CMAKE_CURRENT_LIST_DIR}/scene_exportConfig.cmake.in
    ${CMAKE_BINARY_DIR}/scene_exportConfig.cmake
    INSTALL_DESTINATION ${package_folder}
    PATH_VARS program_folder)
write_basic_package_version_file(${CMAKE_BINARY_DIR}/scene_exportConfigVersion.cmake
    COMPATIBILITY SameMajorVersion)
install(FILES
    ${CMAKE_BINARY_DIR}/scene_exportConfig.cmake
    ${CMAKE_BINARY_DIR}/scene_exportConfigVersion.cmake
    DESTINATION ${package_folder})
file(RELATIVE_PATH prefix_from_pc /prefix/${CMAKE_INSTALL_LIBDIR}/pkgconfig /prefix)
string(REGEX REPLACE "/$" "" prefix_from_pc "${prefix_from_pc}")
configure_file(${CMAKE_CURRENT_LIST_DIR}/scene_export.pc.in
    ${CMAKE_BINARY_DIR}/scene_export.pc @ONLY)
install(FILES ${CMAKE_BINARY_DIR}/scene_export.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)

# The manual page is made of what --help prints, so that it tells of the options that there are.
set(man_page ${CMAKE_BINARY_DIR}/scene_export.1)
add_custom_command(OUTPUT ${man_page}
    COMMAND ${CMAKE_COMMAND} -DPROGRAM=$<TARGET_FILE:scene_export> -DOUTPUT=${man_page}
        -DVERSION=${PROJECT_VERSION} -P ${CMAKE_CURRENT_LIST_DIR}/ManPage.cmake
    DEPENDS scene_export scene_gltf scene_assimp ${CMAKE_CURRENT_LIST_DIR}/ManPage.cmake
    VERBATIM)
add_custom_target(man_page ALL DEPENDS ${man_page})
# Not there if only the program was built.
install(FILES ${man_page} DESTINATION ${CMAKE_INSTALL_MANDIR}/man1 OPTIONAL)

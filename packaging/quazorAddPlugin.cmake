# quazor_add_plugin(NAME SOURCES...): a loadable plug-in NAME.so for `quazor --plugin`.
function(quazor_add_plugin name)
  add_library(${name} MODULE ${ARGN})
  target_link_libraries(${name} PRIVATE quazor::quazor)
  # A plug-in hides its symbols and links everything it uses, so that undefined symbols are linker errors.
  target_link_options(${name} PRIVATE -Wl,--no-undefined)
  # Errors in memory are harder to exploit: the stack is checked, and tables of the linker are read-only from the start.
  target_compile_options(${name} PRIVATE -fstack-protector-strong)
  target_link_options(${name} PRIVATE -Wl,-z,relro -Wl,-z,now)
  # The run path is the installation's from the start: CMake pads one that it will replace with empty entries, and the
  # linker takes those for the working directory.
  set_target_properties(${name} PROPERTIES PREFIX "" CXX_EXTENSIONS OFF CXX_VISIBILITY_PRESET hidden
                        VISIBILITY_INLINES_HIDDEN ON INSTALL_RPATH "$ORIGIN/.." BUILD_WITH_INSTALL_RPATH ON)
  # quazor refuses a plug-in that others may change, which a umask of 002 allows their group.
  add_custom_command(TARGET ${name} POST_BUILD VERBATIM
                     COMMAND chmod go-w "$<TARGET_FILE:${name}>" "$<TARGET_FILE_DIR:${name}>")
endfunction()

# quazor_add_plugin(NAME SOURCES...): a loadable plug-in NAME.so for `quazor --plugin`.
function(quazor_add_plugin name)
  add_library(${name} MODULE ${ARGN})
  target_link_libraries(${name} PRIVATE quazor::quazor)
  # A plug-in hides its symbols and links everything it uses, so that undefined symbols are linker errors.
  target_link_options(${name} PRIVATE -Wl,--no-undefined)
  set_target_properties(${name} PROPERTIES PREFIX "" CXX_EXTENSIONS OFF CXX_VISIBILITY_PRESET hidden
                        VISIBILITY_INLINES_HIDDEN ON INSTALL_RPATH "$ORIGIN/..")
endfunction()

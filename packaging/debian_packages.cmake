# The Debian packages that `cpack` creates from a build, one per component of the installation. The build may be
# configured for any prefix: packages install to /usr.
set(CPACK_GENERATOR DEB)
set(CPACK_PACKAGE_DESCRIPTION_SUMMARY "")  # each package has its own
set(CPACK_PACKAGE_CONTACT "Quazor maintainers <maintainers@quazor.invalid>" CACHE STRING
    "Who the packages name as their maintainer")
set(CPACK_PACKAGING_INSTALL_PREFIX /usr)
set(CPACK_STRIP_FILES ON)
# Independent of the umask of the user who creates the packages.
set(CPACK_INSTALL_DEFAULT_DIRECTORY_PERMISSIONS
    OWNER_READ OWNER_WRITE OWNER_EXECUTE GROUP_READ GROUP_EXECUTE WORLD_READ WORLD_EXECUTE)

set(CPACK_COMPONENTS_ALL program plugins development)
set(CPACK_DEB_COMPONENT_INSTALL ON)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_CONTROL_STRICT_PERMISSION ON)
# Dependencies follow from the linked libraries; libquazor comes from this build.
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS_PRIVATE_DIRS ${CMAKE_LIBRARY_OUTPUT_DIRECTORY})
# The three packages must have the same version, because another version may have another contract.
set(CPACK_DEBIAN_ENABLE_COMPONENT_DEPENDS ON)
set(CPACK_COMPONENT_PLUGINS_DEPENDS program)
set(CPACK_COMPONENT_DEVELOPMENT_DEPENDS program)

# Makes packages of other plug-ins depend on this version too.
get_target_property(so_version quazor SOVERSION)
file(CONFIGURE OUTPUT shlibs CONTENT "libquazor @so_version@ quazor (= @PROJECT_VERSION@)\n" @ONLY)
file(CONFIGURE OUTPUT triggers CONTENT "activate-noawait ldconfig\n")

set(CPACK_DEBIAN_PROGRAM_PACKAGE_NAME quazor)
set(CPACK_DEBIAN_PROGRAM_PACKAGE_SECTION utils)
set(CPACK_DEBIAN_PROGRAM_PACKAGE_RECOMMENDS "quazor-plugins, libjs-dygraphs")
set(CPACK_DEBIAN_PROGRAM_PACKAGE_CONTROL_EXTRA
    ${CMAKE_CURRENT_BINARY_DIR}/shlibs ${CMAKE_CURRENT_BINARY_DIR}/triggers)
set(CPACK_DEBIAN_PROGRAM_DESCRIPTION "hardware diagnostics for a phone's cameras and sensors
Runs diagnostics from loadable plug-ins, judges what they measure by its
limits, and reports the verdicts as text or in forms that other programs
read. It brings a simulated phone, and scenarios of a healthy one and of
faulty ones.
.
The diagnostics themselves are in quazor-plugins.")

set(CPACK_DEBIAN_PLUGINS_PACKAGE_NAME quazor-plugins)
set(CPACK_DEBIAN_PLUGINS_PACKAGE_SECTION utils)
set(CPACK_DEBIAN_PLUGINS_DESCRIPTION "diagnostics of cameras and sensors for quazor
Two plug-ins: diagnostics of synchronised cameras, of the depth module's
projector and of its report channels; and an experiment that captures scan
images of the display's sensor.")

set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_NAME libquazor-dev)
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_SECTION libdevel)
set(CPACK_DEBIAN_DEVELOPMENT_DESCRIPTION "what plug-ins for quazor are built with
The headers of the contract between quazor and its plug-ins, in C++20, with
files for CMake and pkg-config, and a plug-in as an example.")

include(CPack)

# What `cmake --install` puts where: library, headers, CMake package, pkg-config file, programs,
# platform modules, bundled API libraries and their descriptions.

include(CMakePackageConfigHelpers)

install(TARGETS webapi EXPORT webapi-targets)
install(TARGETS webapi_platform)

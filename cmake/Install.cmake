# What `cmake --install` puts where: library, headers, CMake package, pkg-config file, programs,
# bundled API libraries and their descriptions. The platform installs its own modules.

include(CMakePackageConfigHelpers)

# Files in a directory that others may write are not believed, whatever the umask is.
set(CMAKE_INSTALL_DEFAULT_DIRECTORY_PERMISSIONS OWNER_READ OWNER_WRITE OWNER_EXECUTE
    GROUP_READ GROUP_EXECUTE WORLD_READ WORLD_EXECUTE)

set(webapi_package_dir ${CMAKE_INSTALL_LIBDIR}/cmake/webapi)

# Programs and libraries find each other by an absolute path, which a set-user-id program may use,
# unless they stand where the dynamic loader looks anyway.
get_property(webapi_programs DIRECTORY programs PROPERTY BUILDSYSTEM_TARGETS)
if(NOT CMAKE_INSTALL_FULL_LIBDIR IN_LIST CMAKE_PLATFORM_IMPLICIT_LINK_DIRECTORIES)
  set_target_properties(webapi ${webapi_programs}
                        PROPERTIES INSTALL_RPATH ${CMAKE_INSTALL_FULL_LIBDIR})
endif()

install(TARGETS webapi EXPORT webapi-targets LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR})
# Who may start the CGI program, and that it takes root's rights. Where no group was configured, a
# program that is replaced hands on what it had, so that an upgrade locks nobody out.
foreach(program entry.cgi rest.cgi)
set(webapi_entry "\$ENV{DESTDIR}${CMAKE_INSTALL_FULL_LIBEXECDIR}/webapi/${program}")
install(CODE "
  set(webapi_group [[${WEBAPI_CGI_GROUP}]])
  execute_process(COMMAND stat -c %a:%g \"${webapi_entry}\"
                  OUTPUT_VARIABLE webapi_before ERROR_QUIET OUTPUT_STRIP_TRAILING_WHITESPACE)
  if(NOT webapi_group AND webapi_before MATCHES \"^4750:([0-9]+)\$\")
    set(webapi_group \${CMAKE_MATCH_1})
  endif()")
install(TARGETS ${program} RUNTIME DESTINATION ${CMAKE_INSTALL_LIBEXECDIR}/webapi)
install(CODE "
  if(webapi_group)
    message(STATUS \"Set-user-id for the group \${webapi_group}: ${webapi_entry}\")
    execute_process(COMMAND chgrp \${webapi_group} \"${webapi_entry}\"
                    COMMAND_ERROR_IS_FATAL ANY)
    execute_process(COMMAND chmod 4750 \"${webapi_entry}\" COMMAND_ERROR_IS_FATAL ANY)
  else()
    message(STATUS \"No web server may use it yet (-DWEBAPI_CGI_GROUP): ${webapi_entry}\")
  endif()")
endforeach()
install(DIRECTORY include/webapi DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}
        FILES_MATCHING PATTERN *.h)

# The made-up host for tests of API libraries, a component that is asked for by name. Without what
# debuggers want it is a tenth of the size.
install(TARGETS webapi_testing EXPORT webapi-testing-targets
        ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR})
install(CODE "execute_process(COMMAND \"${CMAKE_STRIP}\" --strip-debug
  \"\$ENV{DESTDIR}${CMAKE_INSTALL_FULL_LIBDIR}/libwebapi-ARDO5-testing.a\"
  COMMAND_ERROR_IS_FATAL ANY)")
install(EXPORT webapi-testing-targets NAMESPACE webapi:: DESTINATION ${webapi_package_dir})
install(EXPORT webapi-targets NAMESPACE webapi:: DESTINATION ${webapi_package_dir})
configure_package_config_file(cmake/webapiConfig.cmake.in ${CMAKE_BINARY_DIR}/webapiConfig.cmake
                              INSTALL_DESTINATION ${webapi_package_dir})
write_basic_package_version_file(${CMAKE_BINARY_DIR}/webapiConfigVersion.cmake
                                 COMPATIBILITY SameMinorVersion)
install(FILES ${CMAKE_BINARY_DIR}/webapiConfig.cmake ${CMAKE_BINARY_DIR}/webapiConfigVersion.cmake
              cmake/webapiAddApi.cmake
        DESTINATION ${webapi_package_dir})
file(RELATIVE_PATH webapi_prefix_from_pc ${CMAKE_INSTALL_FULL_LIBDIR}/pkgconfig
     ${CMAKE_INSTALL_PREFIX})
string(REGEX REPLACE "/$" "" webapi_prefix_from_pc ${webapi_prefix_from_pc})
configure_file(cmake/webapi-ARDO5.pc.in ${CMAKE_BINARY_DIR}/webapi-ARDO5.pc @ONLY)
install(FILES ${CMAKE_BINARY_DIR}/webapi-ARDO5.pc
        DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)

# Descriptions stand where entry.cgi looks, whatever the installation prefix is.
set(webapi_installed_descriptions ${WEBAPI_ROOT_PREFIX}/usr/qelo/qeloman/webapi)
set(webapi_shipped_descriptions ${CMAKE_INSTALL_FULL_LIBDIR}/webapi/descriptions)
configure_file(cmake/InstallDescriptions.cmake.in ${CMAKE_BINARY_DIR}/InstallDescriptions.cmake
               @ONLY)
install(SCRIPT ${CMAKE_BINARY_DIR}/InstallDescriptions.cmake)
# Users' processes add their records of background tasks here, and none of them could make it.
set(webapi_task_dir ${WEBAPI_ROOT_PREFIX}/var/lib/webapi/tasks)
install(DIRECTORY DESTINATION ${webapi_task_dir})
install(CODE "execute_process(COMMAND chmod 1733 \"\$ENV{DESTDIR}${webapi_task_dir}\"
                              COMMAND_ERROR_IS_FATAL ANY)")
# The places of root and of the account that methods run as, before somebody else takes them. A
# package makes them where it is installed, by the ids of that host.
install(CODE "
  if(NOT \"\$ENV{DESTDIR}\")
    execute_process(COMMAND sh -c \"
      for name in root system; do
        uid=\\$(id -u \\$name 2> /dev/null) || continue
        place='${webapi_task_dir}'/\\$uid
        if mkdir -m 0700 \\\"\\$place\\\" 2> /dev/null; then
          chown -h \\$uid:\\$(id -g \\$name) \\\"\\$place\\\"
        elif [ \\\"\\$(stat -c %u \\\"\\$place\\\")\\\" != \\$uid ]; then
          echo \\\"\\$place is not \\$name's: remove it, or \\$name can have no tasks\\\" >&2
        fi
      done\" COMMAND_ERROR_IS_FATAL ANY)
  endif()")
# The page that sharing links lead to, for the web server to serve.
install(FILES apis/QELO.Share.Link/page/index.html apis/QELO.Share.Link/page/page.css
              apis/QELO.Share.Link/page/page.js
        DESTINATION ${CMAKE_INSTALL_DATADIR}/webapi/sharing)
# The list of shared folders is the administrator's: one that is there stays, changed or not.
set(webapi_shares ${WEBAPI_ROOT_PREFIX}/etc/webapi)
install(CODE "
  if(NOT EXISTS \"\$ENV{DESTDIR}${webapi_shares}/shares.json\")
    file(INSTALL DESTINATION \"${webapi_shares}\" TYPE FILE
         FILES \"${PROJECT_SOURCE_DIR}/packaging/shares.json\")
  endif()")
get_property(webapi_apis DIRECTORY apis PROPERTY BUILDSYSTEM_TARGETS)
install(TARGETS ${webapi_apis} LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}/webapi/apis)

# Where the service manager looks for what administrators install.
set(webapi_client www-data)
if(WEBAPI_CGI_GROUP)
  set(webapi_client ${WEBAPI_CGI_GROUP})
endif()
foreach(unit qeloapid webapi-server)
  configure_file(packaging/${unit}.service.in ${CMAKE_BINARY_DIR}/${unit}.service.configured @ONLY)
  install(FILES ${CMAKE_BINARY_DIR}/${unit}.service.configured
          DESTINATION lib/systemd/system RENAME ${unit}.service)
endforeach()

# The documents stand to each other as in the source tree, so their links work.
install(FILES README.md DEVELOPING.md CHANGELOG.md LICENSE DESTINATION ${CMAKE_INSTALL_DOCDIR})
install(FILES packaging/lighttpd.conf.in packaging/lighttpd.service.conf packaging/nginx.conf.in
              packaging/apache2.conf.in packaging/apache2-scgi.conf.in packaging/lighttpd-scgi.conf.in
              packaging/nginx-scgi.conf.in
        DESTINATION ${CMAKE_INSTALL_DOCDIR}/packaging)
install(DIRECTORY packaging/fail2ban DESTINATION ${CMAKE_INSTALL_DOCDIR}/packaging)
install(DIRECTORY apis docs DESTINATION ${CMAKE_INSTALL_DOCDIR} FILES_MATCHING PATTERN *.md)
install(DIRECTORY examples DESTINATION ${CMAKE_INSTALL_DOCDIR} USE_SOURCE_PERMISSIONS)

# Programs, modules and descriptions hold the configured prefix: installed below another one, they
# would find nothing. So `cmake --install --prefix` is refused, before anything is written; DESTDIR,
# which changes where files are put and not what they are told, is not.

string(REGEX REPLACE "/$" "" webapi_prefix "${CMAKE_INSTALL_PREFIX}")
install(CODE "
  if(NOT CMAKE_INSTALL_PREFIX STREQUAL [[${webapi_prefix}]])
    message(FATAL_ERROR \"This build is for the prefix ${webapi_prefix}. Configure it with \"
                        \"-DCMAKE_INSTALL_PREFIX=\${CMAKE_INSTALL_PREFIX} instead.\")
  endif()")

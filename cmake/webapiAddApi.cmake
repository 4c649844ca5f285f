# webapi_add_api(NAME SOURCES FILE... DESCRIPTION FILE [LIBRARIES LIBRARY...])
#
# An API library from its sources and its description:
#
# - the library NAME.so, which links webapi::webapi and the LIBRARIES; a function that is nowhere
#   defined is an error of the build, and not of a call;
# - the target NAME_objects, what it is made of, for tests to link;
# - the description NAME.lib, made of a file whose name ends with ".in" by putting variables in the
#   place of @VARIABLE@; @webapi_API_LIBRARY@ is where the library is installed;
# - a part of every build that checks the description against the library (webapi check), unless the
#   variable WEBAPI_CHECK is off or the build is for another machine;
# - the installation of both where calls look for them.

function(webapi_add_api name)
  cmake_parse_arguments(PARSE_ARGV 1 api "" "DESCRIPTION" "SOURCES;LIBRARIES")
  if(api_UNPARSED_ARGUMENTS OR NOT api_SOURCES OR NOT api_DESCRIPTION)
    message(FATAL_ERROR "webapi_add_api(NAME SOURCES FILE... DESCRIPTION FILE [LIBRARIES LIBRARY...])")
  endif()

  add_library(${name}_objects OBJECT ${api_SOURCES})
  set_target_properties(${name}_objects PROPERTIES POSITION_INDEPENDENT_CODE ON)
  target_compile_features(${name}_objects PUBLIC cxx_std_20)
  target_include_directories(${name}_objects PUBLIC ${CMAKE_CURRENT_SOURCE_DIR})
  target_link_libraries(${name}_objects PUBLIC webapi::webapi ${api_LIBRARIES})
  add_library(${name} MODULE $<TARGET_OBJECTS:${name}_objects>)
  set_target_properties(${name} PROPERTIES PREFIX "" LINKER_LANGUAGE CXX)
  target_link_libraries(${name} PRIVATE webapi::webapi ${api_LIBRARIES})
  target_link_options(${name} PRIVATE -Wl,--no-undefined)

  set(webapi_API_LIBRARY ${webapi_API_DIR}/${name}.so)
  set(description ${CMAKE_CURRENT_BINARY_DIR}/${name}.lib)
  if(api_DESCRIPTION MATCHES "\\.in$")
    configure_file(${api_DESCRIPTION} ${description} @ONLY)
  else()
    configure_file(${api_DESCRIPTION} ${description} COPYONLY)
  endif()

  if(NOT DEFINED WEBAPI_CHECK OR WEBAPI_CHECK)
    if(EXISTS "${webapi_PROGRAM}" AND NOT CMAKE_CROSSCOMPILING)
      set(checked ${CMAKE_CURRENT_BINARY_DIR}/${name}.checked)
      add_custom_command(OUTPUT ${checked}
        COMMAND ${webapi_PROGRAM} check --no-accounts --library $<TARGET_FILE:${name}> ${description}
        COMMAND ${CMAKE_COMMAND} -E touch ${checked}
        DEPENDS ${name} ${description}
        COMMENT "Checking ${name}.lib" VERBATIM)
      add_custom_target(${name}_check ALL DEPENDS ${checked})
    endif()
  endif()

  install(TARGETS ${name} LIBRARY DESTINATION ${webapi_API_DIR})
  install(FILES ${description} DESTINATION ${webapi_DESCRIPTION_DIR})
endfunction()

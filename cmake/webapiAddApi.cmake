# webapi_add_api(NAME SOURCES FILE... DESCRIPTION FILE [LIBRARIES LIBRARY...])
#
# An API library from its sources and its description:
#
# - the library NAME.so, which links webapi::webapi and the LIBRARIES; a function that is nowhere
#   defined is an error of the build, and not of a call;
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

  add_library(${name} MODULE ${api_SOURCES})
  set_target_properties(${name} PROPERTIES PREFIX "" WEBAPI_LIBRARIES "${api_LIBRARIES}")
  target_compile_features(${name} PUBLIC cxx_std_20)
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

# webapi_add_api_test(NAME SOURCES FILE... [LIBRARIES LIBRARY...])
#
# A GoogleTest program NAME_test of such an API library, in the same CMakeLists.txt: the API's own
# sources and the test's, with webapi::testing in the place of webapi::webapi
# (find_package(webapi COMPONENTS testing)). API_DESCRIPTION is the description's path in it. Building
# the target "check" builds all and runs the tests.

# Testing is enabled for the scope that asks for it, so this is no function.
macro(webapi_add_api_test)
  enable_testing()
  webapi_make_api_test(${ARGN})
endmacro()

function(webapi_make_api_test name)
  cmake_parse_arguments(PARSE_ARGV 1 test "" "" "SOURCES;LIBRARIES")
  if(test_UNPARSED_ARGUMENTS OR NOT test_SOURCES OR NOT TARGET ${name})
    message(FATAL_ERROR "webapi_add_api_test(NAME SOURCES FILE... [LIBRARIES LIBRARY...]), "
                        "behind webapi_add_api(NAME ...)")
  endif()
  if(NOT TARGET webapi::testing)
    message(FATAL_ERROR "tests need find_package(webapi REQUIRED COMPONENTS testing)")
  endif()
  find_package(GTest REQUIRED)

  get_target_property(sources ${name} SOURCES)
  get_target_property(libraries ${name} WEBAPI_LIBRARIES)
  add_executable(${name}_test ${sources} ${test_SOURCES})
  target_compile_features(${name}_test PRIVATE cxx_std_20)
  target_include_directories(${name}_test PRIVATE ${CMAKE_CURRENT_SOURCE_DIR})
  target_link_libraries(${name}_test PRIVATE webapi::testing GTest::gtest_main ${libraries}
                                             ${test_LIBRARIES})
  target_compile_definitions(
    ${name}_test PRIVATE API_DESCRIPTION="${CMAKE_CURRENT_BINARY_DIR}/${name}.lib")
  add_test(NAME ${name}_test COMMAND ${name}_test)

  if(NOT TARGET check)
    add_custom_target(check COMMAND ${CMAKE_CTEST_COMMAND} --output-on-failure --no-tests=error)
  endif()
  add_dependencies(check ${name} ${name}_test)
  if(TARGET ${name}_check)
    add_dependencies(check ${name}_check)
  endif()
endfunction()

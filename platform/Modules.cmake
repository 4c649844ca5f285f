# The platform's loadable modules: what needs a large library stands outside the common road.

# webapi_platform_module(NAME SOURCES...): the module NAME.so in the module directory. The platform
# loads no file that others may write, whatever the umask of the build was.
function(webapi_platform_module name)
  add_library(module_${name} MODULE ${ARGN})
  set_target_properties(module_${name} PROPERTIES PREFIX "" OUTPUT_NAME ${name}
                        LIBRARY_OUTPUT_DIRECTORY ${CMAKE_BINARY_DIR}/modules)
  target_include_directories(module_${name} PRIVATE ${PROJECT_SOURCE_DIR}/include
                                                    ${PROJECT_SOURCE_DIR})
  add_custom_command(TARGET module_${name} POST_BUILD
    COMMAND chmod go-w ${CMAKE_BINARY_DIR}/modules $<TARGET_FILE:module_${name}>)
  add_dependencies(webapi_platform module_${name})
endfunction()

find_library(CRYPT_LIBRARY crypt REQUIRED)
find_library(PAM_LIBRARY pam)
if(NOT PAM_LIBRARY AND NOT WEBAPI_ROOT_PREFIX)
  message(FATAL_ERROR "The host's passwords are checked with PAM: libpam is missing")
endif()
find_package(SQLite3 REQUIRED)
find_package(OpenSSL REQUIRED COMPONENTS Crypto)

webapi_platform_module(password_crypt login/module/PasswordCrypt.cpp base/Secrets.cpp)
target_link_libraries(module_password_crypt PRIVATE ${CRYPT_LIBRARY})

if(PAM_LIBRARY)
  webapi_platform_module(password_pam login/module/PasswordPam.cpp)
  target_link_libraries(module_password_pam PRIVATE ${PAM_LIBRARY})
endif()

# The token database is the administrators' program's too.
add_library(webapi_token_store STATIC tokens/module/TokenStore.cpp base/Secrets.cpp)
target_include_directories(webapi_token_store PUBLIC ${PROJECT_SOURCE_DIR}/include
                                                     ${PROJECT_SOURCE_DIR})
target_link_libraries(webapi_token_store PUBLIC SQLite::SQLite3 OpenSSL::Crypto)

webapi_platform_module(tokens tokens/module/TokenModule.cpp)
target_link_libraries(module_tokens PRIVATE webapi_token_store)

if(WEBAPI_ROOT_PREFIX)
  set(password_module module_password_crypt)
else()
  set(password_module module_password_pam)
endif()
install(TARGETS ${password_module} module_tokens
        LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}/webapi/modules)
add_subdirectory(tasks/module)

# The platform's loadable modules: what needs a large library stands outside the common road.

# webapi_platform_module(NAME SOURCES... LIBRARIES...): the module NAME.so in the module directory.
# The platform loads no file that others may write, whatever the umask of the build was.
function(webapi_platform_module name)
  cmake_parse_arguments(PARSE_ARGV 1 module "" "" "SOURCES;LIBRARIES")
  list(TRANSFORM module_SOURCES PREPEND ${PROJECT_SOURCE_DIR}/platform/)
  webapi_module_library(module_${name} ${name} modules)
  add_dependencies(webapi_platform module_${name})
  if(WEBAPI_TESTS)
    webapi_module_library(module_${name}_sanitized ${name} modules-sanitized)
    webapi_sanitize(module_${name}_sanitized)
  endif()
endfunction()

function(webapi_module_library target file directory)
  add_library(${target} MODULE ${module_SOURCES})
  set_target_properties(${target} PROPERTIES PREFIX "" OUTPUT_NAME ${file}
                        LIBRARY_OUTPUT_DIRECTORY ${CMAKE_BINARY_DIR}/${directory})
  target_include_directories(${target} PRIVATE ${PROJECT_SOURCE_DIR}/include ${PROJECT_SOURCE_DIR})
  target_link_libraries(${target} PRIVATE ${module_LIBRARIES})
  # What is inside it is its own: nothing of it is looked up elsewhere, nor found from there.
  target_link_options(${target} PRIVATE -Wl,--exclude-libs,ALL -Wl,-Bsymbolic)
  add_custom_command(TARGET ${target} POST_BUILD
    COMMAND chmod go-w ${CMAKE_BINARY_DIR}/${directory} $<TARGET_FILE:${target}>)
endfunction()

find_library(CRYPT_LIBRARY crypt REQUIRED)
find_library(PAM_LIBRARY pam)
if(NOT PAM_LIBRARY AND NOT WEBAPI_ROOT_PREFIX)
  message(FATAL_ERROR "The host's passwords are checked with PAM: libpam is missing")
endif()
# Whole inside the modules where there is an archive of it: the shared one has its 1,300 references
# to itself bound anew by each process that loads it, which is a sixth of a call's time.
find_package(SQLite3 REQUIRED)
find_library(SQLITE_ARCHIVE NAMES libsqlite3.a)
set(SQLITE_LIBRARY SQLite::SQLite3)
if(SQLITE_ARCHIVE)
  set(SQLITE_LIBRARY ${SQLITE_ARCHIVE} m)
endif()
# Hashes of access tokens and of sharing ids: libcrypto takes half a call's time.
find_library(MD_ARCHIVE NAMES libmd.a md REQUIRED)
find_package(OpenSSL REQUIRED COMPONENTS Crypto)
find_package(CURL REQUIRED)

webapi_platform_module(password_crypt SOURCES login/module/PasswordCrypt.cpp base/Secrets.cpp
                       LIBRARIES ${CRYPT_LIBRARY})

if(PAM_LIBRARY)
  webapi_platform_module(password_pam SOURCES login/module/PasswordPam.cpp LIBRARIES ${PAM_LIBRARY})
endif()

# The token database is the administrators' program's too.
function(webapi_token_store twin)
  add_library(webapi_token_store${twin} STATIC tokens/module/TokenStore.cpp
              tokens/module/TokenSchema.cpp base/Secrets.cpp base/module/SecretHash.cpp base/module/OwnDatabase.cpp)
  target_include_directories(webapi_token_store${twin} PUBLIC ${PROJECT_SOURCE_DIR}/include
                                                              ${PROJECT_SOURCE_DIR})
  target_link_libraries(webapi_token_store${twin} PUBLIC SQLite::SQLite3 ${MD_ARCHIVE})
endfunction()
webapi_token_store("")
if(WEBAPI_TESTS)
  webapi_token_store(_sanitized)
  webapi_sanitize(webapi_token_store_sanitized)
endif()

webapi_platform_module(tokens
  SOURCES tokens/module/TokenModule.cpp tokens/module/TokenStore.cpp tokens/module/TokenSchema.cpp
          base/Secrets.cpp base/module/SecretHash.cpp base/module/OwnDatabase.cpp
  LIBRARIES ${SQLITE_LIBRARY} ${MD_ARCHIVE})
webapi_platform_module(tasks
  SOURCES tasks/module/TaskModule.cpp tasks/module/StoreConnection.cpp
          tasks/module/StoreDirectory.cpp tasks/module/TaskClearing.cpp
          tasks/module/TaskDatabase.cpp tasks/module/TaskSchema.cpp tasks/module/Patience.cpp
          base/Secrets.cpp tasks/Id.cpp tasks/ProcessIdentity.cpp
  LIBRARIES ${SQLITE_LIBRARY})
webapi_platform_module(ciphers SOURCES ciphers/module/CipherModule.cpp LIBRARIES OpenSSL::Crypto)
webapi_platform_module(relay SOURCES relay/module/RelayModule.cpp relay/module/Transfer.cpp
                       LIBRARIES CURL::libcurl)

webapi_platform_module(sharing
  SOURCES sharing/module/SharingModule.cpp sharing/module/SqliteLinkStore.cpp
          sharing/module/SqliteSchema.cpp sharing/module/SqliteVisits.cpp
          base/module/SecretHash.cpp base/module/OwnDatabase.cpp
  LIBRARIES JsonCpp::JsonCpp ${SQLITE_LIBRARY} ${MD_ARCHIVE})

# Checks parameters: on its own, since few calls need it.
file(GLOB schema_sources CONFIGURE_DEPENDS RELATIVE ${PROJECT_SOURCE_DIR}/platform
     ${PROJECT_SOURCE_DIR}/platform/schema/module/*.cpp)
webapi_platform_module(schema SOURCES ${schema_sources} LIBRARIES webapi_base_static)

# Sharing links have passwords of their own; those of accounts are PAM's on the host.
set(password_modules module_password_crypt)
if(NOT WEBAPI_ROOT_PREFIX)
  list(APPEND password_modules module_password_pam)
endif()
install(TARGETS ${password_modules} module_tokens module_tasks module_relay module_ciphers
        module_sharing module_schema
        LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}/webapi/modules)

# What every target is compiled and linked with.

set(CMAKE_CXX_STANDARD 20)
set(CMAKE_CXX_STANDARD_REQUIRED ON)
set(CMAKE_CXX_EXTENSIONS ON)  # TEMP_FAILURE_RETRY and the host's own calls
set(CMAKE_POSITION_INDEPENDENT_CODE ON)
set(CMAKE_CXX_VISIBILITY_PRESET hidden)
set(CMAKE_VISIBILITY_INLINES_HIDDEN ON)
set(CMAKE_EXPORT_COMPILE_COMMANDS ON)

add_compile_options(-Wall -Wextra -Wshadow -Wnon-virtual-dtor -Wformat=2 -Werror)
# A unique symbol is looked up in every library, and keeps its own from ever being unloaded.
add_compile_options(-fno-gnu-unique)
add_compile_definitions(_FILE_OFFSET_BITS=64)
# A CGI process lives for two milliseconds, nearly all of it in the dynamic loader: no library
# that is not needed, and few, large segments, each of which is a mapping and a page to be faulted
# in.
add_link_options(-Wl,--as-needed -Wl,-O1 -Wl,-z,noseparate-code)
if(WEBAPI_HARDENED)
  add_compile_options(-fstack-protector-strong)
  # The C library's guards of buffers need an optimising build.
  add_compile_options($<$<NOT:$<CONFIG:Debug>>:-U_FORTIFY_SOURCE>
                      $<$<NOT:$<CONFIG:Debug>>:-D_FORTIFY_SOURCE=2>)
  add_link_options(-Wl,-z,relro -Wl,-z,now)
else()
  # Symbols are bound at the first call, so the loader's tables stay writable as a whole: to protect
  # the rest of them would split a mapping of each library, which costs a process a fiftieth.
  add_link_options(-Wl,-z,lazy -Wl,-z,norelro)
endif()

# What crt files name in case that something is there is settled when linking: at each start it was
# looked for in every library in vain.
add_link_options(-Wl,--no-undefined -Wl,-z,nodynamic-undefined-weak)

find_package(jsoncpp REQUIRED)
find_package(Threads REQUIRED)

# Where programs, API libraries and platform modules stand: in the build tree for a private root,
# else where they are installed.
if(WEBAPI_ROOT_PREFIX)
  set(WEBAPI_MODULE_DIR ${CMAKE_BINARY_DIR}/modules)
  set(WEBAPI_API_LIB_DIR ${CMAKE_BINARY_DIR}/apis)
else()
  set(WEBAPI_MODULE_DIR ${CMAKE_INSTALL_FULL_LIBDIR}/webapi/modules)
  set(WEBAPI_API_LIB_DIR ${CMAKE_INSTALL_FULL_LIBDIR}/webapi/apis)
endif()
set(WEBAPI_DESCRIPTION_DIR ${CMAKE_BINARY_DIR}/descriptions)

# A shared library of a private root is known by its absolute path: whoever links it finds it at
# once. A search path would make the loader try two dozen directories for each library, which costs
# a tenth of a CGI process. Installed libraries have ordinary names, which the loader has cached.
if(WEBAPI_ROOT_PREFIX)
  set(CMAKE_SKIP_RPATH ON)
endif()
function(webapi_shared_library target)
  # Names within a library are bound when it is linked, not looked up when it is loaded.
  target_link_options(${target} PRIVATE -Wl,-Bsymbolic)
  set_target_properties(${target} PROPERTIES VERSION ${PROJECT_VERSION}
                                             SOVERSION ${PROJECT_VERSION_MAJOR})
  if(WEBAPI_ROOT_PREFIX)
    set_target_properties(${target} PROPERTIES NO_SONAME ON)
    target_link_options(${target} PRIVATE -Wl,-soname,$<TARGET_FILE:${target}>)
  endif()
endfunction()

# webapi_sanitize(TARGET): built for the address and undefined-behaviour sanitizers, and only when it
# is asked for. What the tests run under them has a twin, NAME_sanitized, in the same tree.
function(webapi_sanitize target)
  set(sanitizers -fsanitize=address,undefined)
  target_compile_options(${target} PRIVATE ${sanitizers} -fno-omit-frame-pointer
                         -fno-sanitize-recover=all -O1 -g1)
  target_link_options(${target} PRIVATE ${sanitizers} -Wl,-z,undefs)
  set_target_properties(${target} PROPERTIES EXCLUDE_FROM_ALL ON)
endfunction()

# webapi_precompile(TARGET HEADER...): the headers are read once for all the targets that name this
# list of them first, which takes more than half of a test's time to compile away. Never for what is
# shipped: there each file has to include what it needs.
function(webapi_precompile target)
  string(MAKE_C_IDENTIFIER "PRECOMPILED ${ARGN}" list)
  get_property(first GLOBAL PROPERTY ${list})
  if(first)
    target_precompile_headers(${target} REUSE_FROM ${first})
  else()
    set_property(GLOBAL PROPERTY ${list} ${target})
    target_precompile_headers(${target} PRIVATE ${ARGN})
  endif()
endfunction()

# webapi_folder(NAME FOLDER): the folder's sources, those below it too, as one OBJECT library, from which both the
# shared library and the unit tests are linked.
function(webapi_folder name folder)
  file(GLOB_RECURSE sources CONFIGURE_DEPENDS ${folder}/*.cpp)
  if(NOT sources)
    file(WRITE ${CMAKE_BINARY_DIR}/empty.cpp "")
    set(sources ${CMAKE_BINARY_DIR}/empty.cpp)
  endif()
  webapi_objects(${name} ${sources})
  if(WEBAPI_TESTS)
    webapi_objects(${name}_sanitized ${sources})
    webapi_sanitize(${name}_sanitized)
    webapi_precompile(${name}_sanitized <json/json.h> <algorithm> <functional> <map> <memory> <string>)
  endif()
endfunction()

function(webapi_objects name)
  add_library(${name} OBJECT ${ARGN})
  target_include_directories(${name} PUBLIC ${PROJECT_SOURCE_DIR}/include ${PROJECT_SOURCE_DIR})
  target_compile_definitions(${name} PUBLIC WEBAPI_ROOT_PREFIX="${WEBAPI_ROOT_PREFIX}")
  target_link_libraries(${name} PUBLIC JsonCpp::JsonCpp)
endfunction()

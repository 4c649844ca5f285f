# Puts the files of template/ into one source, TARGET's Templates.cpp.

# webapi_templates(TARGET PATH FILE...): each file by the path that it has in a new project.
function(webapi_templates target)
  set(folder ${CMAKE_CURRENT_SOURCE_DIR}/webapi/new/template)
  set(entries)
  while(ARGN)
    list(POP_FRONT ARGN path file)
    file(READ ${folder}/${file} text)
    string(APPEND entries "    {\"${path}\",\n     R\"~~(${text})~~\"},\n")
    set_property(DIRECTORY APPEND PROPERTY CMAKE_CONFIGURE_DEPENDS ${folder}/${file})
  endwhile()
  file(GENERATE OUTPUT ${CMAKE_CURRENT_BINARY_DIR}/Templates.cpp CONTENT
"#include \"programs/webapi/new/Templates.h\"

namespace QELO::AuthorProgram {

std::span<const Template> Templates() {
  static constexpr Template templates[] = {
${entries}  };
  return templates;
}

}  // namespace QELO::AuthorProgram
")
  target_sources(${target} PRIVATE ${CMAKE_CURRENT_BINARY_DIR}/Templates.cpp)
endfunction()

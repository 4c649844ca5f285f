#pragma once

#include <span>
#include <string_view>

namespace QELO::AuthorProgram {

/// A file of a new project. In both, @NAME@ stands for the API's name and @PROJECT@ for an
/// identifier made of its last part.
struct Template {
  std::string_view path;
  std::string_view text;
};

/// The files of template/, which the build puts into the program.
std::span<const Template> Templates();

}  // namespace QELO::AuthorProgram

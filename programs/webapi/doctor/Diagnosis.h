#pragma once

#include <string>

namespace QELO::AuthorProgram {

/// What is found on a host, a line each on standard output: whether it is in order, and what to do
/// where it is not.
class Diagnosis {
 public:
  /// In order.
  void Good(const std::string& what);
  /// Perhaps as it should be: what to know of it.
  void Note(const std::string& what);
  /// Calls fail because of it, or somebody may do what only root should.
  /// @param remedy  what to do, mostly a command
  void Wrong(const std::string& what, const std::string& remedy);

  int Count() const { return wrong_; }  ///< of what is wrong

 private:
  int wrong_ = 0;
};

/// What it means that something is not there.
enum class Missing { kWrong, kMadeLater, kLeftOut };

/// What a place in the file system must be.
struct Place {
  std::string path;
  unsigned mode;  ///< the bits that it may have
  bool isDirectory;
  Missing missing;
  const char* what;  ///< for people
};

/// Says whether a place is there, is root's (in a private root, or ours) and has no more bits than
/// it may have.
void LookAtPlace(const Place& place, Diagnosis& diagnosis);

/// The parts of the host, each with all that belongs to it.
void LookAtAccounts(Diagnosis& diagnosis);
void LookAtPlaces(Diagnosis& diagnosis);
/// Descriptions, their libraries and the sockets that they name.
void LookAtDescriptions(Diagnosis& diagnosis);
/// @param entry  the CGI program
void LookAtEntry(const std::string& entry, Diagnosis& diagnosis);
/// @param file  the web server's configuration; "": those that are usual
void LookAtWebServer(const std::string& file, Diagnosis& diagnosis);
void LookAtSockets(Diagnosis& diagnosis);

/// Whether somebody listens at a socket. @return 0, or errno
int Connect(const std::string& path, int type);

}  // namespace QELO::AuthorProgram

#pragma once

#include <string>
#include <vector>

/// What the code under test wrote to syslog: the test program's own syslog() collects it.
struct SyslogCapture {
  struct Message {
    int priority;  ///< as passed, facility included
    std::string text;
  };
  static std::vector<Message>& Messages();
  /// What an openlog() was given, and how many closelog() there were before it.
  struct Opening {
    std::string identity;
    int options;
    int facility;
    int closings;
  };
  static std::vector<Opening>& Openings();
  /// The identity of the last openlog().
  static std::string& Identity();
  /// Forgets messages and openings.
  static void Clear();
  /// Where messages are written as well, a line "<priority>text" each, so that those of child
  /// processes are seen; -1: nowhere.
  static int& Copy();
  /// How many messages contain this text.
  static int Count(const std::string& part);
};

#pragma once

#include <string>
#include <string_view>
#include <utility>

#include "webapi/base/UniqueFd.h"

/// The few words between the server and one of its fronts, over a pair of sockets that keeps
/// messages apart. A message is a letter and what belongs to it; a descriptor may go along.
namespace QELO::ControlChannel {

/// Longest message in bytes: a request's header, above all.
inline constexpr size_t kLongest = size_t{32} << 10;

/// What the server says.
enum ToFront : char {
  kRequest = 'R',   ///< a request's header, and its connection
  kWorker = 'W',    ///< the worker asked for
  kNoWorker = 'N',  ///< there is none
};

/// What a front says. Each request is answered by one of the first four.
enum FromFront : char {
  kDone = 'D',      ///< the request is served, or somebody's who serves it
  kLeft = 'L',      ///< nothing has happened: it has to be served by a process of its own
  kDoneLast = 'd',  ///< the same, and the front ends
  kLeftLast = 'l',
  kWantWorker = 'W',  ///< a worker: its account
};

/// Two ends, closed when a program is started. @return false, with errno
bool Make(UniqueFd& first, UniqueFd& second);

/// @param descriptor  goes along; -1: none
/// @param waits       until there is room; else a message without room is lost
/// @return false, with errno, when it is not sent
bool Send(int channel, char kind, std::string_view text, int descriptor, bool waits);

struct Message {
  char kind = '\0';
  std::string text;
  UniqueFd descriptor;
};

/// Waits for a message, unless told otherwise. @return false at the channel's end, with errno 0,
/// and when there is none
bool Receive(int channel, Message& message, bool waits);

}  // namespace QELO::ControlChannel

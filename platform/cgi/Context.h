#pragma once

#include <cstring>

#include "platform/base/Secrets.h"
#include "webapi/platform/Cgi.h"

namespace QELO::Platform {

/// The CGI library's part of a QeloCgiContext, behind the first word. It holds no pointer, so a
/// context may be copied as bytes.
struct ContextArea {
  enum State : unsigned char { kNoId, kMalformedId, kHasId };

  char id[kSecretLength + 1];
  State state;
  unsigned char language;  ///< number in the table of languages, counted from 1; 0: none asked for
  unsigned char known;     ///< the flags below tell of the session, whose record was read
  unsigned char timedOut;
  unsigned char skipCheckIp;
  unsigned char hasMore;  ///< the record has options that stand nowhere but there
  unsigned char reserved[2];
};

inline constexpr size_t kContextAreaOffset = sizeof(void*);
static_assert(kContextAreaOffset + sizeof(ContextArea) == sizeof(QeloCgiContext));

inline ContextArea loadArea(const QeloCgiContext& context) {
  ContextArea area;
  memcpy(&area, context.block + kContextAreaOffset, sizeof area);
  return area;
}

inline void storeArea(const ContextArea& area, QeloCgiContext& context) {
  memcpy(context.block + kContextAreaOffset, &area, sizeof area);
}

}  // namespace QELO::Platform

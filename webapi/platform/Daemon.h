#pragma once

#include <chrono>
#include <cstddef>
#include <string>

#include "webapi/Export.h"

/// The host's daemon library: messages between the processes of one host.
namespace qelodaemon {

/// Longest message in bytes: what a request's body may be at most, written as JSON and with what
/// goes along with it.
inline constexpr size_t kLargestMessage = size_t{64} << 20;

/// How long the other side is waited for. Each is a whole operation's.
struct Limits {
  std::chrono::milliseconds connect{5000};    ///< to be taken in by a listener that is busy
  std::chrono::milliseconds send{30000};      ///< until the last byte of a message is taken
  std::chrono::milliseconds receive{330000};  ///< until the last byte of one is here; a call's time
                                              ///< in a daemon, its wait for a turn included
};

/// One connection that carries whole messages: what one side sends, the other receives by one call.
/// On the wire a message is its length, 32 bits with the highest byte first, and its bytes. A
/// descriptor of -1 is no connection, and every operation on it fails. After a failure the
/// connection is of no use any more.
class WEBAPI_API SockConnection {
 public:
  /// @param descriptor  a connected stream socket, which is closed at the end; -1: none
  explicit SockConnection(int descriptor, const Limits& limits = {});
  SockConnection(const SockConnection&) = delete;
  SockConnection& operator=(const SockConnection&) = delete;
  virtual ~SockConnection();

  /// @return false, with errno, when the other side is gone or does not take it within the limit,
  ///         and when the message is longer than kLargestMessage: nothing is sent then
  bool Send(const std::string& message);
  /// @param message  receives the message; unchanged on failure. Memory is used for what has come,
  ///                 not for what was announced.
  /// @return false, with errno, when none comes whole within the limit (ETIMEDOUT), the other side
  ///         has closed (EPIPE), or it announces more than kLargestMessage (EMSGSIZE)
  bool Recv(std::string& message);

 protected:
  int descriptor_;
  const Limits limits_;
};

/// The connection to a listener at a path of the file system.
class WEBAPI_API DomainSockConnection : public SockConnection {
 public:
  explicit DomainSockConnection(const std::string& path, const Limits& limits = {});
  ~DomainSockConnection() override;

  /// @return false, with errno, when nobody listens there, it may not be used, or its queue has no
  ///         room within the limit
  bool Connect();

 private:
  const std::string path_;
};

}  // namespace qelodaemon

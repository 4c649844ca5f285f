#pragma once

/// What the parts of APIPolling have in common.
namespace QELO {

/// The name in their log messages.
inline constexpr char kPollingSource[] = "APIPolling.cpp";

// Owners beside single users, as the task manager knows them.
inline constexpr char kAdministratorsOwner[] = "@administrators";
inline constexpr char kEverybodyOwner[] = "@users";

// Groups, as clients and API methods name them.
inline constexpr char kUserGroup[] = "user";
inline constexpr char kAdminGroup[] = "admin";
inline constexpr char kEveryoneGroup[] = "everyone";

// Errors of APIPolling, see there.
enum PollingError : int {
  POLLING_ERR_UNKNOWN = 500,
  POLLING_ERR_NOT_STORED = 501,
  POLLING_ERR_BAD_PARAMETERS = 502,
  POLLING_ERR_INVALID_ID = 503,
  POLLING_ERR_BUSY = 504,
  POLLING_ERR_NOT_ADMIN = 505,
  POLLING_ERR_NOT_SIGNALLED = 506,
  POLLING_ERR_TOO_MANY = 507,
  POLLING_ERR_NO_SUCH_TASK = 508
};

}  // namespace QELO

// The collector of log messages; the support library that it stands in holds the fake platform too.
#include "tests/support/SyslogCapture.cpp"  // NOLINT(bugprone-suspicious-include)

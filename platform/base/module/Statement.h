#pragma once

#include <sqlite3.h>

#include <cstdint>
#include <string>
#include <string_view>

namespace QELO::Platform {

/// One run of a prepared statement, which is ready for the next when this ends. Without a
/// statement, or with a value that cannot be bound, every step fails.
class Statement {
 public:
  explicit Statement(sqlite3_stmt* statement)
      : statement_(statement), bound_(statement != nullptr) {}
  ~Statement() {
    if (statement_ != nullptr) {
      sqlite3_reset(statement_);
      sqlite3_clear_bindings(statement_);
    }
  }
  Statement(const Statement&) = delete;
  Statement& operator=(const Statement&) = delete;

  /// The text must live as long as this.
  Statement& Text(int index, std::string_view text) {
    return Bound(sqlite3_bind_text64(statement_, index, text.data(), text.size(), SQLITE_STATIC,
                                     SQLITE_UTF8));
  }
  Statement& Bytes(int index, std::string_view bytes) {
    return Bound(sqlite3_bind_blob64(statement_, index, bytes.data(), bytes.size(), SQLITE_STATIC));
  }
  Statement& Number(int index, int64_t number) {
    return Bound(sqlite3_bind_int64(statement_, index, number));
  }

  /// @return whether there is a (further) row
  bool Row() {
    result_ = bound_ ? sqlite3_step(statement_) : SQLITE_ERROR;
    return result_ == SQLITE_ROW;
  }
  /// Runs a statement without rows. @return false on failure
  bool Run() { return !Row() && Good(); }
  /// False when the last step failed.
  bool Good() const { return result_ == SQLITE_ROW || result_ == SQLITE_DONE; }

  int64_t NumberAt(int column) { return sqlite3_column_int64(statement_, column); }
  bool IsNull(int column) { return sqlite3_column_type(statement_, column) == SQLITE_NULL; }
  std::string TextAt(int column) {
    const void* text = sqlite3_column_blob(statement_, column);
    const int size = sqlite3_column_bytes(statement_, column);
    return text != nullptr ? std::string(static_cast<const char*>(text), static_cast<size_t>(size))
                           : std::string();
  }

 private:
  Statement& Bound(int result) {
    bound_ = bound_ && result == SQLITE_OK;
    return *this;
  }

  sqlite3_stmt* statement_;
  bool bound_;
  int result_ = SQLITE_DONE;
};

}  // namespace QELO::Platform

#pragma once

/// Marks what `libwebapi-ARDO5` exports; everything else is hidden.
///
/// What the comments of these headers leave out:
/// - An object and what it refers to belong to one thread. Nothing here starts a thread.
/// - A reference or pointer that is handed to an operation is used until it returns, one that is
///   handed to a constructor until the object is destroyed. Neither is taken over.
/// - Values are returned as copies. A reference that is returned holds until the object changes.
/// - Nothing throws but for want of memory. An operation that can fail says so by its result.
/// - Text is UTF-8, and a text that may not be null is not asked whether it is.
#define WEBAPI_API __attribute__((visibility("default")))

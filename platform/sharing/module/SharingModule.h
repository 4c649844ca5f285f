#pragma once

#include <string>

#include "platform/sharing/LinkStore.h"

/// Opens the database.
/// @param error  receives the reason when the result is null
using SharingOpen = QELO::Platform::LinkStore* (*)(const char* path, bool create,
                                                   std::string& error);

inline constexpr char kSharingModule[] = "sharing.so";
inline constexpr char kSharingOpen[] = "webapiSharingOpen";

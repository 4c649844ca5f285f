#pragma once

/// Where the build has put the platform's modules: those that the sanitizers watch stand apart.
extern const char* const kBuiltModuleDir;

#include "tests/unit/platform/BuiltModules.h"

const char* const kBuiltModuleDir = BUILT_MODULE_DIR;

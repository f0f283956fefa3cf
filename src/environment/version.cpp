// The version that is compiled into the library.
#include "zanbase/version.h"

int IMPGetVersion() noexcept { return ZANBASE_VERSION; }

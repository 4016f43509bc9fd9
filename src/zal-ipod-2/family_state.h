// Cached state of the command families that do not have a header of their own yet.
// A family moves its struct into its own header when it grows; each struct releases what
// it owns in its destructor (the handle is destroyed by zal_ipod_close) and has a reset
// that the playback cache reset calls.
#pragma once

#include <cstdint>

#include "zal-ipod-2/artwork_state.h"

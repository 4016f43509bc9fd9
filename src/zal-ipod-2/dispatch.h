// Dispatcher of received packets: events become event records for the event callback,
// replies no wait took go through their slot's decoder to the reply callback.
#pragma once

#include "zal-ipod-2/handle.h"

extern "C" ZAL_API void zal_ipod_pending_event(zal_ipod_handle *h);

// Event kind of an "event" type text (ZALIPOD_EVENT_UNKNOWN for any other text).
int zal_event_kind_of(const char *type);

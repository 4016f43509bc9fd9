// Device list of the handle and the session decoder.
#pragma once

#include "zal-ipod-2/handle.h"

// Session decoder, opening and closing forms (record may be null: no reply).
int32_t zal_session_decode_open(zal_ipod_handle *h, const zal_ipod_reply *reply);
int32_t zal_session_decode_close(zal_ipod_handle *h, const zal_ipod_reply *reply);

// Device entry at index, or nullptr when the index is not valid.
gval *zal_device_entry(const zal_ipod_handle *h, int index);

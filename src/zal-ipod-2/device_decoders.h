// Decoders of the device-control and device-information replies that fill cached state.
// Used by the _sync forms and, through the pending-reply slots, by the dispatcher for
// replies that arrive outside a wait.
#pragma once

#include <cstdint>

#include "zal-ipod-2/handle.h"

// VoiceOver item property reply into the handle's item record: 1, or -1 (record unchanged).
int32_t zal_voiceover_item_decode(zal_ipod_handle *h, const zal_ipod_reply *reply);
// Lingo version reply into the handle's stored version: 1, or -1 (version unchanged).
int32_t zal_lingo_version_decode(zal_ipod_handle *h, const zal_ipod_reply *reply);
// Localization reply into the handle's text of the reply's type: 1, or -1 (nothing stored).
int32_t zal_localization_decode(zal_ipod_handle *h, const zal_ipod_reply *reply);

// Decoders of replies that arrive outside a wait, found through the pending-reply slots.
// Each command family plugs its decoders in by filling its rows of the tables in
// reply_decoders.cpp; the dispatcher only walks the tables.
#pragma once

#include <cstddef>
#include <cstdint>

#include "zal-ipod-2/handle.h"

// Turns a reply record into the result given to the reply callback.
using zal_reply_decoder = int32_t (*)(zal_ipod_handle *h, const zal_ipod_reply *reply);
// Adjusts the generic rule's result for the replies of one slot.
using zal_reply_adjuster = int32_t (*)(zal_ipod_handle *h, int32_t result);

struct zal_reply_decoder_row {
    uint16_t zal_pending_slots::*slot;
    zal_reply_decoder decode;  // nullptr until the family provides it: generic rule
    bool passes_error_text;    // the callback gets the handle's error text after decoding
};

struct zal_reply_adjuster_row {
    uint16_t zal_pending_slots::*slot;
    zal_reply_adjuster adjust;
};

struct zal_reply_tables {
    const zal_reply_decoder_row *decoders;
    std::size_t decoder_count;
    const zal_reply_adjuster_row *adjusters;
    std::size_t adjuster_count;
};

// Rows in the order the dispatcher compares them; the first equal slot decides.
zal_reply_tables zal_reply_decoder_tables();

// The generic rule for replies outside a wait: integer -> itself; hash with "error" ->
// error text stored, 0; anything else (or no payload) -> 0. *text gets the error text.
int32_t zal_generic_reply_result(zal_ipod_handle *h, const zal_ipod_reply *reply,
                                 const char **text);

// Artwork of the current (or a given) track as the handle keeps it: geometry, the pixel
// bytes and, when the daemon shares them through a file, the mapping of that file.
//
// The data pointer is null, the mapping itself, or a heap buffer the handle owns. The
// mapping is unmapped before it is replaced; a heap buffer is freed before it is replaced
// and never when it is the mapping.
#pragma once

#include <cstddef>
#include <cstdint>

#include "zal-ipod-2/serialize.h"

struct zal_ipod_handle;

struct zal_artwork_state {
    uint16_t width = 0;
    uint16_t height = 0;
    uint16_t rowstride = 0;
    unsigned char *data = nullptr;
    uint8_t pixel_format = 0;
    uint32_t data_length = 0;
    void *mapping = nullptr;
    int32_t mapping_length = 0;
    // Bytes readable at data (the mapping's length or the buffer's size). The length
    // accessor never reports more than this, whatever the geometry or "data_length" say.
    std::size_t data_capacity = 0;
    // The decoded bytes value of an inline reply when data points into it (the pixels are
    // kept where the reply's decoding put them instead of being copied once more).
    gval *image_value = nullptr;

    zal_artwork_state() = default;
    zal_artwork_state(const zal_artwork_state &) = delete;
    zal_artwork_state &operator=(const zal_artwork_state &) = delete;
    ~zal_artwork_state() { reset(); }

    // Empties the record: geometry and format 0, the buffer freed, the mapping unmapped.
    void reset();
    // Frees the heap buffer (never the mapping); data becomes null.
    void drop_buffer();
    // Unmaps the mapping; data becomes null when it pointed there.
    void drop_mapping();
};

// Pixel format of data whose length the reply gives explicitly ("data_length").
constexpr uint8_t kArtworkExplicitLength = 255;
// Least reply time-out of the artwork requests: pictures take the device a while.
constexpr uint32_t kArtworkTimeoutSec = 20;

struct zal_ipod_reply;
// The artwork decoder (the _sync forms and replies that arrive outside a wait): 1 when a
// picture was stored, -1 otherwise.
int32_t zal_artwork_decode(zal_ipod_handle *h, const zal_ipod_reply *reply);

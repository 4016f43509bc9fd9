// Media browser state of the client handle: the selection stack (category and item levels
// alternating from a category at level 0), the identifier list of the last filtered query,
// the collection identifier text and the layout flag of the last track information request.
// The names of the current page live in the records cache (zal_records_state::records),
// which the iAP1 database commands and the iAP2 item queries both fill.
#pragma once

#include <cstdint>

#include "zal-ipod-2/serialize.h"

struct zal_ipod_handle;
struct zal_ipod_reply;

// Levels of the selection stack. A walk that would push beyond it is refused with an error
// text and leaves the stack as it was (see browser.cpp).
constexpr int32_t kSelectionLevels = 256;

struct zal_browser_state {
    int32_t selection_count = 0;
    int32_t selection_is_item[kSelectionLevels] = {};
    int32_t selection_value[kSelectionLevels] = {};
    char *selection_name[kSelectionLevels] = {};
    int32_t selection_offset[kSelectionLevels] = {};
    int32_t selection_item_count[kSelectionLevels] = {};
    // identifiers_only of the last zal_ipod_media_lib_get_tracks_info.
    int32_t track_info_ids_only = 0;
    // Decoded reply of the last identifier query; the pointer arrays handed out point into it.
    gval *identifiers = nullptr;
    // The list the last iAP2 track information request handed out (it points into
    // identifiers) and its number of strings; the track field accessors accept only it.
    const char **tracks_info = nullptr;
    int32_t tracks_info_count = 0;
    // "collection_id" text of the last collection identifier reply.
    char *collection_id = nullptr;

    zal_browser_state();
    zal_browser_state(const zal_browser_state &) = delete;
    zal_browser_state &operator=(const zal_browser_state &) = delete;
    ~zal_browser_state();

    // Frees the names of every level and returns to the top (nothing selected).
    void clear_levels();
    // Cache reset of connect and session open: a walk belongs to the device it was made on,
    // so a new session starts at the top.
    void reset() { clear_levels(); }
};

// Rebuilds the records cache from a GET_ITEMS_CURRENT_CATEGORY reply for a page that starts
// at offset; returns the number of elements of the reply array (0 for no reply, a reply
// without data or one that is not an array: the cache then stays). Split from the wait so
// the benchmark can time it on a prepared reply.
int32_t zal_browser_cache_items(zal_ipod_handle *h, const zal_ipod_reply *reply, int32_t offset);

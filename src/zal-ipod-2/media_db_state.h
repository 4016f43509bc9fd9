// iAP1 database browsing state of the client handle: the category walk, the records cache,
// the last track-record results and the library information, plus the decoders that fill
// them (also run by the dispatcher for replies that arrive outside a wait).
#pragma once

#include <cstdint>

#include "zal-ipod-2/serialize.h"

struct zal_ipod_handle;
struct zal_ipod_reply;

struct zal_records_state {
    int32_t current_category = 0;
    // Records in the current category by the last set-category or select reply; -1 after
    // a failed one, so that a browser sees no items.
    int32_t record_count = 0;
    int32_t hierarchy = 0;
    // Array [unused, validity, offset, count, names...]; replaced whole by each records reply.
    gval *records = nullptr;
    // Last decoded GET_DB_TRACK_INFO / GET_PB_TRACK_INFO results, element 0 removed.
    gval *db_track_info = nullptr;
    gval *pb_track_info = nullptr;
    uint8_t device_uid[8] = {};
    uint8_t last_sync_time[7] = {};
    int32_t itunes_info_count = 0;

    zal_records_state() = default;
    zal_records_state(const zal_records_state &) = delete;
    zal_records_state &operator=(const zal_records_state &) = delete;
    ~zal_records_state();

    // Cache reset of connect and session open: the walk starts again; results and library
    // information stay until replaced.
    void reset() {
        current_category = 0;
        record_count = 0;
    }
};

// Reply decoders (the dispatcher's rows and the _sync forms share them).
int32_t zal_records_decode(zal_ipod_handle *h, const zal_ipod_reply *reply);
int32_t zal_itunes_info_decode(zal_ipod_handle *h, const zal_ipod_reply *reply);
int32_t zal_db_track_info_decode(zal_ipod_handle *h, const zal_ipod_reply *reply);
int32_t zal_pb_track_info_decode(zal_ipod_handle *h, const zal_ipod_reply *reply);

// The decoder table of replies that arrive outside a wait. Rows with a null decoder fall
// back to the generic rule until their family supplies the decoder.
#include "zal-ipod-2/reply_decoders.h"

#include "zal-ipod-2/command.h"
#include "zal-ipod-2/device_decoders.h"
#include "zal-ipod-2/devices.h"
#include "zal-ipod-2/media_db_state.h"
#include "zal-ipod-2/playback_state.h"

namespace {

// Chapter index: only an error check.
int32_t decode_chapter_index(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    return zal_decode_hash(h, reply, [](zal_ipod_handle *, const gval *) { return int32_t{0}; });
}

int32_t decode_uid_list(zal_ipod_handle *, const zal_ipod_reply *) {
    return 1;
}

int32_t adjust_track_index(zal_ipod_handle *h, int32_t result) {
    h->playback.track_index = result;
    return result;
}

int32_t adjust_record_count(zal_ipod_handle *h, int32_t result) {
    h->records.record_count = result;
    return result >= 0 ? 1 : 0;
}

int32_t adjust_preference(zal_ipod_handle *h, int32_t result) {
    return zal_preference_setting(h->slots.preference_class, result);
}

using S = zal_pending_slots;

constexpr zal_reply_decoder_row kDecoders[] = {
    {&S::track_info_tid, zal_decode_current_track_info, true},
    {&S::indexed_track_info_tid, zal_decode_indexed_track_info, true},
    {&S::play_state_tid, zal_decode_play_state, false},
    {&S::chapter_index_tid, decode_chapter_index, false},
    {&S::chapter_status_tid, zal_decode_chapter_status, false},
    {&S::artwork_by_uid_tid, zal_artwork_decode, true},
    {&S::artwork_tid, zal_artwork_decode, true},
    {&S::sample_rate_tid, zal_decode_sample_rate, true},
    {&S::records_tid, zal_records_decode, false},
    {&S::session_tid, zal_session_decode_open, false},
    {&S::itunes_info_tid, zal_itunes_info_decode, false},
    {&S::db_track_info_tid, zal_db_track_info_decode, false},
    {&S::pb_track_info_tid, zal_pb_track_info_decode, false},
    {&S::uid_list_tid, decode_uid_list, false},
    {&S::lingo_version_tid, zal_lingo_version_decode, false},
    {&S::localization_tid, zal_localization_decode, false},
    {&S::voiceover_item_tid, zal_voiceover_item_decode, false},
};

constexpr zal_reply_adjuster_row kAdjusters[] = {
    {&S::track_index_tid, adjust_track_index},
    {&S::category_tid, adjust_record_count},
    {&S::select_db_tid, adjust_record_count},
    {&S::preference_tid, adjust_preference},
};

}  // namespace

zal_reply_tables zal_reply_decoder_tables() {
    return {kDecoders, sizeof kDecoders / sizeof kDecoders[0], kAdjusters,
            sizeof kAdjusters / sizeof kAdjusters[0]};
}

int32_t zal_generic_reply_result(zal_ipod_handle *h, const zal_ipod_reply *reply,
                                 const char **text) {
    *text = nullptr;
    if (reply->length == 0 || reply->payload == nullptr) return 0;
    gval *v = unserialize(reply->payload, reply->length);
    int32_t result = 0;
    if (zal_kind(v) == SERIALIZE_INT) {
        result = serialize_get_int(v);
    } else if (zal_kind(v) == SERIALIZE_HASH) {
        gval *error = serialize_hash_get(v, "error");
        if (zal_kind(error) == SERIALIZE_STRING) {
            zal_set_error_message(h, serialize_get_string(error));
            *text = h->error_message.load();
        }
    }
    serialize_free(v);
    return result;
}

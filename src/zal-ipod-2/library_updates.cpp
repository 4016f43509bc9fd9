// Library updates and play lists: the media library's identifier, tracking of library
// changes, the update items and collection records, play items, prepared identifier lists,
// Genius and play list information.
#include <cstring>

#include "common/log.h"
#include "zal-ipod-2/command.h"
#include "zal-ipod-2/packet.h"

namespace {

// Update items record: mlid, item list bytes, auxiliary string, a zero byte, list length.
constexpr uint32_t kUpdateItemsSize = 392;
constexpr uint32_t kUpdateMlidOffset = 0;
constexpr uint32_t kUpdateListOffset = 129;
constexpr uint32_t kUpdateAuxOffset = 258;
constexpr uint32_t kUpdateLengthOffset = 388;
constexpr uint32_t kFieldSize = 129;

// Collection record: start index, type byte, mlid, two zero bytes, collection identifier.
constexpr uint32_t kCollectionSize = 144;
constexpr uint32_t kCollectionStartOffset = 0;
constexpr uint32_t kCollectionTypeOffset = 4;
constexpr uint32_t kCollectionMlidOffset = 5;
constexpr uint32_t kCollectionIdOffset = 136;

constexpr uint32_t kUidSize = 8;

void put_le32(unsigned char *p, uint32_t v) {
    for (int i = 0; i < 4; ++i) p[i] = static_cast<unsigned char>(v >> (8 * i));
}
void put_le64(unsigned char *p, uint64_t v) {
    for (int i = 0; i < 8; ++i) p[i] = static_cast<unsigned char>(v >> (8 * i));
}
void put_be64(unsigned char *p, uint64_t v) {
    for (int i = 0; i < 8; ++i) p[i] = static_cast<unsigned char>(v >> (8 * (7 - i)));
}

// The records' text fields are fixed: a caller's text that does not fit (or is missing) is
// a programming error. Release builds must not overrun the record, and a cut mlid would
// name another library, so such a request is refused (logged, nothing sent) rather than
// truncated.
bool mlid_fits(const char *mlid, const char *function) {
    if (mlid != nullptr && strnlen(mlid, MAXIMUM_MLID_LENGTH) < MAXIMUM_MLID_LENGTH) return true;
    ZAL_LOGE("%s: precondition \"%s\" violated; nothing sent\n", function,
             "strlen(mlid) < MAXIMUM_MLID_LENGTH");
    return false;
}

bool refuse(const char *function, const char *what) {
    ZAL_LOGE("%s: %s; nothing sent\n", function, what);
    return false;
}

gval *update_items_record(const char *aux_string, const char *mlid, const void *list,
                          int list_length, const char *function) {
    if (!mlid_fits(mlid, function)) return nullptr;
    if (list_length < 0 || list_length >= MAXIMUM_MLID_LENGTH) {
        refuse(function, "precondition \"listLength < MAXIMUM_MLID_LENGTH\" violated");
        return nullptr;
    }
    if (list == nullptr && list_length > 0) {
        refuse(function, "no item list");
        return nullptr;
    }
    // The auxiliary field holds 128 characters and the terminator.
    if (aux_string != nullptr && strnlen(aux_string, kFieldSize) >= kFieldSize) {
        refuse(function, "auxiliary string longer than 128 characters");
        return nullptr;
    }
    unsigned char record[kUpdateItemsSize] = {};
    memcpy(record + kUpdateMlidOffset, mlid, strlen(mlid) + 1);
    if (aux_string != nullptr)
        memcpy(record + kUpdateAuxOffset, aux_string, strlen(aux_string) + 1);
    if (list_length > 0) memcpy(record + kUpdateListOffset, list, static_cast<size_t>(list_length));
    put_le32(record + kUpdateLengthOffset, static_cast<uint32_t>(list_length));
    return zal_arg_struct(record, sizeof record);
}

gval *collection_record(uint64_t collection_id, int type, int start_index, const char *mlid,
                        const char *function) {
    if (!mlid_fits(mlid, function)) return nullptr;
    unsigned char record[kCollectionSize] = {};
    put_le64(record + kCollectionIdOffset, collection_id);
    put_le32(record + kCollectionStartOffset, static_cast<uint32_t>(start_index));
    record[kCollectionTypeOffset] = static_cast<unsigned char>(type & 0xff);
    memcpy(record + kCollectionMlidOffset, mlid, strlen(mlid) + 1);
    return zal_arg_struct(record, sizeof record);
}

// [count, start, uid...] with each identifier as 8 bytes, most significant first. Built
// with its final size reserved, so a long list costs one allocation for the array.
gval *play_items_argument(const uint64_t *uids, int count, int start, const char *function) {
    if (count < 0) return refuse(function, "negative count"), nullptr;
    if (uids == nullptr && count > 0) return refuse(function, "no identifiers"), nullptr;
    gval *array = serialize_array_reserve(static_cast<uint32_t>(count) + 2);
    if (array == nullptr) return nullptr;
    bool ok = serialize_array_add(array, serialize_int(count)) == 0 &&
              serialize_array_add(array, serialize_int(start)) == 0;
    for (int i = 0; ok && i < count; ++i) {
        unsigned char bytes[kUidSize];
        put_be64(bytes, uids[i]);
        ok = serialize_array_add(array, serialize_bytes(bytes, kUidSize)) == 0;
    }
    if (!ok) {
        serialize_free(array);
        return nullptr;
    }
    return array;
}

// A refused argument (nullptr) must not reach zal_cmd_send, which would log it as out of
// memory: refusals are logged where they are decided.
int send_if(zal_ipod_handle *h, uint16_t opcode, gval *arg, const char *function,
            zal_slot slot = nullptr) {
    if (arg == nullptr) return 0;
    return zal_cmd_send(h, opcode, arg, function, slot);
}

// The library update and update items forms report 0 whatever the reply.
int32_t decode_nothing(zal_ipod_handle *, const zal_ipod_reply *) {
    return 0;
}

int32_t read_items_played(zal_ipod_handle *, const gval *hash) {
    return zal_hash_int(hash, "items_played", -1);
}
int32_t read_collection_played(zal_ipod_handle *, const gval *hash) {
    return zal_hash_int(hash, "collection_played", -1);
}

// Genius availability: 0 unless the reply says it is available; then its non-zero
// "result", or 1. An error hash keeps its text and reads as not available.
int32_t decode_genius_available(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    gval *v = zal_reply_value(reply);
    int32_t result = 0;
    if (zal_kind(v) == SERIALIZE_HASH) {
        zal_reply_error(h, v);
        if (zal_hash_int(v, "is_genius_availablefortrack", 0) != 0) {
            const int32_t r = zal_hash_int(v, "result", 0);
            result = r != 0 ? r : 1;
        }
    }
    serialize_free(v);
    return result;
}

// Play list information, read for the caller's data byte: the decoder pattern takes no
// extra argument, so the _sync form decodes here itself.
int32_t decode_playlist_info(zal_ipod_handle *h, const zal_ipod_reply *reply, uint8_t *data) {
    gval *v = zal_reply_value(reply);
    int32_t result = -1;
    if (zal_kind(v) == SERIALIZE_HASH) {
        zal_reply_error(h, v);
        if (zal_hash_int(v, "playlist_info", 0) != 0) {
            result = zal_hash_int(v, "status", -1);
            (void)zal_hash_int(v, "type", 0);  // the device's; not used here
            const gval *d = serialize_hash_get(v, "data");
            if (data != nullptr && zal_kind(d) == SERIALIZE_INT)
                *data = static_cast<uint8_t>(serialize_get_int(d) & 0xff);
        }
    }
    serialize_free(v);
    return result;
}

}  // namespace

extern "C" {

ZAL_API int zal_ipod_get_media_library_unique_id(zal_ipod_handle *h) {
    return zal_cmd_send(h, ZAL_OP_MEDIA_LIB_UID);
}
ZAL_API int zal_ipod_get_media_library_unique_id_sync(zal_ipod_handle *h, char *buffer, int size) {
    if (h == nullptr) return 0;
    zal_ipod_reply *reply =
        zal_ipod_wait_for_tid_ex(h, static_cast<uint16_t>(zal_ipod_get_media_library_unique_id(h)));
    gval *v = zal_reply_value(reply);
    int result = 0;
    if (zal_kind(v) == SERIALIZE_STRING) {
        result = 1;
        const uint32_t wanted = v->len + 1;  // the text and its terminator
        if (buffer != nullptr && size > 0)
            memcpy(buffer, serialize_get_string(v),
                   wanted < static_cast<uint32_t>(size) ? wanted : static_cast<uint32_t>(size));
    }
    serialize_free(v);
    reply_record_free(reply);
    return result;
}

ZAL_API int zal_ipod_set_update_items(zal_ipod_handle *h, const char *aux_string, const char *mlid,
                                      const void *list, int listLength) {
    if (h == nullptr) return 0;
    return send_if(h, ZAL_OP_SET_UPDATE_ITEMS,
                   update_items_record(aux_string, mlid, list, listLength, __func__), __func__);
}
ZAL_API int zal_ipod_set_update_items_sync(zal_ipod_handle *h, const char *aux_string,
                                           const char *mlid, const void *list, int listLength) {
    return zal_cmd_sync(h, zal_ipod_set_update_items(h, aux_string, mlid, list, listLength),
                        decode_nothing);
}

ZAL_API int zal_ipod_start_library_update(zal_ipod_handle *h, const char *text) {
    return zal_cmd_send(h, ZAL_OP_START_LIB_UPDATE, zal_arg_string(text), __func__);
}
ZAL_API int zal_ipod_start_library_update_sync(zal_ipod_handle *h, const char *text) {
    return zal_cmd_sync(h, zal_ipod_start_library_update(h, text), decode_nothing);
}
ZAL_API int zal_ipod_stop_library_update(zal_ipod_handle *h, const char *text) {
    return zal_cmd_send(h, ZAL_OP_STOP_LIB_UPDATE, zal_arg_string(text), __func__);
}
ZAL_API int zal_ipod_stop_library_update_sync(zal_ipod_handle *h, const char *text) {
    return zal_cmd_sync(h, zal_ipod_stop_library_update(h, text), decode_nothing);
}
ZAL_API int zal_ipod_resume_library_update(zal_ipod_handle *h, const char *first,
                                           const char *second) {
    return zal_cmd_send(h, ZAL_OP_RESUME_LIB_UPDATE,
                        zal_arg_array({zal_arg_string(first), zal_arg_string(second)}), __func__);
}
ZAL_API int zal_ipod_resume_library_update_sync(zal_ipod_handle *h, const char *first,
                                                const char *second) {
    return zal_cmd_sync(h, zal_ipod_resume_library_update(h, first, second), decode_nothing);
}

ZAL_API int zal_play_items(zal_ipod_handle *h, const uint64_t *uids, int count, int start) {
    if (h == nullptr) return 0;
    return send_if(h, ZAL_OP_PLAYITEMS, play_items_argument(uids, count, start, __func__),
                   __func__);
}
ZAL_API int zal_play_items_sync(zal_ipod_handle *h, const uint64_t *uids, int count, int start) {
    return zal_cmd_sync_hash(h, zal_play_items(h, uids, count, start), read_items_played);
}

ZAL_API int zal_play_collection(zal_ipod_handle *h, uint64_t collection_id, int type,
                                int start_index, const char *mlid) {
    if (h == nullptr) return 0;
    return send_if(h, ZAL_OP_PLAYCOLLECTION,
                   collection_record(collection_id, type, start_index, mlid, __func__), __func__);
}
ZAL_API int zal_play_collection_sync(zal_ipod_handle *h, uint64_t collection_id, int type,
                                     int start_index, const char *mlid) {
    return zal_cmd_sync_hash(h, zal_play_collection(h, collection_id, type, start_index, mlid),
                             read_collection_played);
}

ZAL_API int zal_ipod_prepare_uid_list(zal_ipod_handle *h, int first, int second, int size,
                                      const void *bytes) {
    if (h == nullptr) return 0;
    if (size < 0 || (bytes == nullptr && size > 0))
        return refuse(__func__, "no identifier bytes of that size"), 0;
    return zal_cmd_send(h, ZAL_OP_PREPARE_UID_LIST,
                        zal_arg_array({zal_arg_int(first), zal_arg_int(second), zal_arg_int(size),
                                       zal_arg_bytes(bytes, static_cast<uint32_t>(size))}),
                        __func__, &zal_pending_slots::uid_list_tid);
}
ZAL_API int zal_ipod_prepare_uid_list_sync(zal_ipod_handle *h, int first, int second, int size,
                                           const void *bytes) {
    return zal_cmd_sync_int(h, zal_ipod_prepare_uid_list(h, first, second, size, bytes));
}

ZAL_API int zal_ipod_play_uid_list(zal_ipod_handle *h, const uint8_t uid[8]) {
    if (h == nullptr) return 0;
    if (uid == nullptr) return refuse(__func__, "no identifier"), 0;
    return zal_cmd_send(h, ZAL_OP_PLAY_UID_LIST, zal_arg_bytes(uid, kUidSize), __func__,
                        &zal_pending_slots::uid_list_tid);
}
ZAL_API int zal_ipod_play_uid_list_sync(zal_ipod_handle *h, const uint8_t uid[8]) {
    return zal_cmd_sync_int(h, zal_ipod_play_uid_list(h, uid));
}

ZAL_API int zal_ipod_create_genius_playlist(zal_ipod_handle *h, int a, int b) {
    return zal_cmd_send(h, ZAL_OP_CREATE_GENIUS_PLAYLIST, zal_arg_ints({a, b}), __func__);
}
ZAL_API int zal_ipod_create_genius_playlist_sync(zal_ipod_handle *h, int a, int b) {
    return zal_cmd_sync_int(h, zal_ipod_create_genius_playlist(h, a, b));
}
ZAL_API int zal_ipod_refresh_genius_playlist(zal_ipod_handle *h, int a) {
    return zal_cmd_send(h, ZAL_OP_REFRESH_GENIUS_PLAYLIST, zal_arg_int(a), __func__);
}
ZAL_API int zal_ipod_refresh_genius_playlist_sync(zal_ipod_handle *h, int a) {
    return zal_cmd_sync_int(h, zal_ipod_refresh_genius_playlist(h, a));
}
ZAL_API int zal_ipod_is_genius_availablefortrack(zal_ipod_handle *h, int a, int b) {
    return zal_cmd_send(h, ZAL_OP_IS_GENIUS_AVAILABLEFORTRACK, zal_arg_ints({a, b}), __func__);
}
ZAL_API int zal_ipod_is_genius_availablefortrack_sync(zal_ipod_handle *h, int a, int b) {
    if (h == nullptr) return 0;
    return zal_cmd_sync(h, zal_ipod_is_genius_availablefortrack(h, a, b), decode_genius_available);
}
ZAL_API int zal_ipod_get_playlist_info(zal_ipod_handle *h, int a, int b) {
    return zal_cmd_send(h, ZAL_OP_GET_PLAYLIST_INFO, zal_arg_ints({a, b}), __func__);
}
ZAL_API int zal_ipod_get_playlist_info_sync(zal_ipod_handle *h, int a, int b, uint8_t *data) {
    if (h == nullptr) return -1;
    zal_ipod_reply *reply =
        zal_ipod_wait_for_tid_ex(h, static_cast<uint16_t>(zal_ipod_get_playlist_info(h, a, b)));
    const int32_t result = decode_playlist_info(h, reply, data);
    reply_record_free(reply);
    return result;
}

}  // extern "C"

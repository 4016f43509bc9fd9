// Artwork transfer: the picture of the current track (optionally at a time position) or of
// any track by its 64-bit identifier, delivered through a file the daemon shares (mapped,
// never copied) or inline in the reply (one allocation, one copy); the artwork times list;
// the accessors of the handle's artwork record.
#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>

#include "common/log.h"
#include "common/value_internal.h"
#include "zal-ipod-2/artwork_state.h"
#include "zal-ipod-2/command.h"
#include "zal-ipod-2/packet.h"
#include "zal-ipod-2/playback_state.h"

void zal_artwork_state::drop_buffer() {
    if (image_value != nullptr) {
        serialize_free(image_value);
        image_value = nullptr;
    } else if (data != nullptr && data != mapping) {
        free(data);
    }
    if (data != mapping) {
        data = nullptr;
        data_capacity = 0;
    }
}

void zal_artwork_state::drop_mapping() {
    if (mapping == nullptr) return;
    munmap(mapping, static_cast<std::size_t>(mapping_length));
    if (data == mapping) {
        data = nullptr;
        data_capacity = 0;
    }
    mapping = nullptr;
    mapping_length = 0;
}

void zal_artwork_state::reset() {
    drop_buffer();
    drop_mapping();
    width = height = rowstride = 0;
    pixel_format = 0;
    data_length = 0;
}

namespace {

gval *reply_value(const zal_ipod_reply *reply) {
    if (reply == nullptr || reply->length == 0 || reply->payload == nullptr) return nullptr;
    return unserialize(reply->payload, reply->length);
}

// Maps `length` bytes of the shared file at path; nullptr (logged) when the file cannot be
// opened, is shorter than the picture (touching a page past its end would raise SIGBUS in
// the client) or cannot be mapped.
void *map_shared_file(const char *path, std::size_t length) {
    if (length == 0) {
        ZAL_LOGE("artwork: %s: the picture has no pixels to map\n", path);
        return nullptr;
    }
    int fd = open(path, O_RDWR | O_CLOEXEC);
    if (fd < 0) {
        ZAL_LOGE("artwork: cannot open %s: %s\n", path, strerror(errno));
        return nullptr;
    }
    struct stat st = {};
    void *mapped = nullptr;
    if (fstat(fd, &st) != 0 || st.st_size < 0 ||
        static_cast<uint64_t>(st.st_size) < static_cast<uint64_t>(length)) {
        ZAL_LOGE("artwork: %s holds fewer than the %zu bytes of the picture\n", path, length);
    } else {
        mapped = mmap(nullptr, length, PROT_READ | PROT_WRITE, MAP_SHARED, fd, 0);
        if (mapped == MAP_FAILED) {
            ZAL_LOGE("artwork: cannot map %s: %s\n", path, strerror(errno));
            mapped = nullptr;
        }
    }
    close(fd);  // the mapping stays valid without the descriptor
    return mapped;
}

// Pixels in the daemon's shared file. A mapping that is large enough is kept as it is: the
// daemon writes every picture into the same file, so the pixels are already there.
int32_t store_shared(zal_artwork_state &a, const char *path) {
    const uint32_t needed = uint32_t{a.height} * a.rowstride;
    if (a.mapping != nullptr && static_cast<uint32_t>(a.mapping_length) >= needed && needed > 0) {
        // A picture delivered inline since the mapping was made would otherwise still be
        // what the data pointer shows: the reply says the picture is in the file.
        if (a.data != a.mapping) {
            a.drop_buffer();
            a.data = static_cast<unsigned char *>(a.mapping);
            a.data_capacity = static_cast<std::size_t>(a.mapping_length);
        }
        return 1;
    }
    a.drop_mapping();
    // mapping_length is a signed 32-bit field: a larger picture is refused.
    void *mapped = needed <= INT32_MAX ? map_shared_file(path, needed) : nullptr;
    if (mapped == nullptr) {
        // The old mapping is gone and no new one exists: nothing may point at pixels that
        // are not this reply's, so the record is left empty.
        a.reset();
        return -1;
    }
    a.drop_buffer();
    a.mapping = mapped;
    a.mapping_length = static_cast<int32_t>(needed);
    a.data = static_cast<unsigned char *>(mapped);
    a.data_capacity = needed;
    return 1;
}

// Pixels inside the reply: one allocation and one copy in all, the ones that decoding
// the reply made; the data points into that decoded value, which the record keeps. Only a
// reply with fewer bytes than height x row stride is copied into a buffer of that size
// (the tail zero-filled), so that a client that reads as many bytes as the length
// accessor reports always stays inside the pixels.
int32_t store_inline(zal_artwork_state &a, gval *hash) {
    gval *image = serialize_hash_get(hash, "image");
    uint32_t count = 0;
    auto *bytes =
        static_cast<unsigned char *>(const_cast<void *>(serialize_get_bytes(image, &count)));
    const std::size_t needed = uint32_t{a.height} * a.rowstride;
    if (count >= needed) {
        a.drop_buffer();  // the mapping, if any, stays mapped for a later shared-file reply
        a.image_value = value_hash_take(hash, "image");
        a.data = count > 0 ? bytes : nullptr;
        a.data_capacity = count;
        return 1;
    }
    auto *copy = static_cast<unsigned char *>(malloc(needed));
    if (copy == nullptr) {
        ZAL_LOGE("artwork: no memory for %zu bytes of pixels\n", needed);
        return -1;
    }
    if (count > 0) memcpy(copy, bytes, count);
    memset(copy + count, 0, needed - count);
    a.drop_buffer();
    a.data = copy;
    a.data_capacity = needed;
    return 1;
}

int32_t read_artwork(zal_ipod_handle *h, gval *hash) {
    const char *path = zal_hash_string(hash, "image_path");
    gval *image = serialize_hash_get(hash, "image");
    // A reply that carries neither pixels nor a file leaves the previous picture alone.
    if (path == nullptr && zal_kind(image) != SERIALIZE_BYTES) return -1;
    zal_state_guard lock(h);
    zal_artwork_state &a = h->artwork;
    a.width = static_cast<uint16_t>(zal_hash_int(hash, "width", 0));
    a.height = static_cast<uint16_t>(zal_hash_int(hash, "height", 0));
    a.rowstride = static_cast<uint16_t>(zal_hash_int(hash, "rowstride", 0));
    if (path != nullptr) return store_shared(a, path);
    if (store_inline(a, hash) < 0) return -1;
    gval *format = serialize_hash_get(hash, "pixel_format");
    if (zal_kind(format) == SERIALIZE_INT) {
        a.pixel_format = static_cast<uint8_t>(serialize_get_int(format));
        a.data_length = a.pixel_format == kArtworkExplicitLength
                            ? static_cast<uint32_t>(zal_hash_int(hash, "data_length", 0))
                            : uint32_t{a.height} * a.rowstride;
    }
    return 1;
}

// The artwork requests wait at least kArtworkTimeoutSec, raised before the request goes
// out; the client's own time-out comes back afterwards whatever the wait gave.
template <class Send>
int32_t artwork_sync(zal_ipod_handle *h, Send send) {
    if (h == nullptr) return -1;
    const uint32_t saved = h->read_timeout_sec.load();
    if (saved < kArtworkTimeoutSec) h->read_timeout_sec = kArtworkTimeoutSec;
    int32_t result = zal_cmd_sync(h, send(), zal_artwork_decode);
    h->read_timeout_sec = saved;
    return result;
}

// Artwork times: the reply is an array of integers whose first item is not a time. A reply
// that is not an array of integers (the daemon never sends one) is refused as a whole:
// -1 with both out-parameters untouched.
int32_t decode_times(zal_ipod_handle *h, const zal_ipod_reply *reply, int32_t **times,
                     int32_t *count) {
    gval *v = reply_value(reply);
    if (v == nullptr) return -1;
    int32_t result = -1;
    if (zal_kind(v) == SERIALIZE_HASH) {
        const char *error = zal_hash_string(v, "error");
        if (error != nullptr) zal_set_error_message(h, error);
    } else if (zal_kind(v) == SERIALIZE_ARRAY) {
        const int n = serialize_array_count(v);
        bool integers = true;
        for (int i = 0; i < n && integers; ++i)
            integers = zal_kind(serialize_array_get(v, static_cast<uint32_t>(i))) == SERIALIZE_INT;
        if (integers) {
            if (count != nullptr) *count = n - 1;
            int32_t *list =
                n >= 2 ? static_cast<int32_t *>(malloc(sizeof(int32_t) * (n - 1))) : nullptr;
            if (list != nullptr) {
                for (int i = 1; i < n; ++i)
                    list[i - 1] =
                        serialize_get_int(serialize_array_get(v, static_cast<uint32_t>(i)));
                if (times != nullptr)
                    *times = list;
                else
                    free(list);
                result = 1;
            }
        }
    }
    serialize_free(v);
    return result;
}

}  // namespace

// The hash reply rule, on a decoded value that the decoder may take the pixels out of.
int32_t zal_artwork_decode(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    gval *v = reply_value(reply);
    int32_t result = -1;
    if (zal_kind(v) == SERIALIZE_HASH) {
        gval *error = serialize_hash_get(v, "error");
        if (error != nullptr)
            zal_set_error_message(
                h, zal_kind(error) == SERIALIZE_STRING ? serialize_get_string(error) : "");
        else
            result = read_artwork(h, v);
    }
    serialize_free(v);
    return result;
}

extern "C" {

ZAL_API int zal_ipod_current_track_artwork(zal_ipod_handle *h, int value) {
    return zal_cmd_send(h, ZAL_OP_CURRENT_TRACK_ARTWORK, zal_arg_int(value), __func__,
                        &zal_pending_slots::artwork_tid);
}
ZAL_API int zal_ipod_current_track_artwork_sync(zal_ipod_handle *h, int value) {
    return artwork_sync(h, [&] { return zal_ipod_current_track_artwork(h, value); });
}

ZAL_API int zal_ipod_current_track_pos_artwork(zal_ipod_handle *h, int value, int position) {
    return zal_cmd_send(h, ZAL_OP_CURRENT_TRACK_POS_ARTWORK, zal_arg_ints({value, position}),
                        __func__, &zal_pending_slots::artwork_tid);
}
ZAL_API int zal_ipod_current_track_pos_artwork_sync(zal_ipod_handle *h, int value, int position) {
    return artwork_sync(h, [&] { return zal_ipod_current_track_pos_artwork(h, value, position); });
}

ZAL_API int zal_ipod_track_artwork_by_uid(zal_ipod_handle *h, uint64_t uid) {
    unsigned char bytes[8];
    for (int i = 0; i < 8; ++i) bytes[i] = static_cast<unsigned char>(uid >> (56 - 8 * i));
    return zal_cmd_send(h, ZAL_OP_GET_TRACK_ARTWORK_BY_UID,
                        zal_arg_array({zal_arg_bytes(bytes, sizeof bytes)}), __func__,
                        &zal_pending_slots::artwork_by_uid_tid);
}
ZAL_API int zal_ipod_track_artwork_by_uid_sync(zal_ipod_handle *h, uint64_t uid) {
    return artwork_sync(h, [&] { return zal_ipod_track_artwork_by_uid(h, uid); });
}

ZAL_API int zal_ipod_current_track_artwork_times(zal_ipod_handle *h, int value) {
    return zal_cmd_send(h, ZAL_OP_CURRENT_TRACK_ARTWORK_TIMES, zal_arg_int(value), __func__);
}
ZAL_API int zal_ipod_current_track_artwork_times_sync(zal_ipod_handle *h, int value,
                                                      int32_t **times, int32_t *count) {
    if (h == nullptr) return -1;
    zal_ipod_reply *reply = zal_ipod_wait_for_tid_ex(
        h, static_cast<uint16_t>(zal_ipod_current_track_artwork_times(h, value)));
    int32_t result = decode_times(h, reply, times, count);
    reply_record_free(reply);
    return result;
}

ZAL_API const unsigned char *zal_ipod_current_track_artwork_data(zal_ipod_handle *h) {
    return h != nullptr ? h->artwork.data : nullptr;
}
ZAL_API uint16_t zal_ipod_current_track_artwork_width(zal_ipod_handle *h) {
    return h != nullptr ? h->artwork.width : 0;
}
ZAL_API uint16_t zal_ipod_current_track_artwork_height(zal_ipod_handle *h) {
    return h != nullptr ? h->artwork.height : 0;
}
ZAL_API uint16_t zal_ipod_current_track_artwork_rowstride(zal_ipod_handle *h) {
    return h != nullptr ? h->artwork.rowstride : 0;
}
ZAL_API uint8_t zal_ipod_current_track_artwork_pixel_format(zal_ipod_handle *h) {
    return h != nullptr ? h->artwork.pixel_format : 0;
}
// Height x row stride, or the explicit data length when the geometry is empty; never more
// than the bytes behind the data pointer.
ZAL_API uint32_t zal_ipod_current_track_artwork_length(zal_ipod_handle *h) {
    if (h == nullptr) return 0;
    const zal_artwork_state &a = h->artwork;
    const uint32_t product = uint32_t{a.height} * a.rowstride;
    const uint32_t length = product != 0 ? product : a.data_length;
    return static_cast<uint32_t>(std::min<std::size_t>(length, a.data_capacity));
}

}  // extern "C"

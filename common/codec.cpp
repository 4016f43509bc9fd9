// Wire encoding of values: one ASCII tag per value, big-endian fields, no alignment.
//
// Encoding sizes the output once (the *_pack_calc functions) and writes it with the
// *_pack writers, which must agree with the sizes byte for byte.
//
// Decoding treats its input as hostile. These are its rules where the format itself
// trusts the sender:
//  - It never reads past `len`. unserialize() of zero bytes, or of an unknown first tag,
//    returns NULL; so does a top-level scalar or blob whose length runs past the input.
//  - Inside an array or hash, an element that cannot be decoded (its length runs past the
//    input, or it would nest deeper than kMaxDepth containers) ends that container: the
//    elements decoded before it are kept and decoding goes on with the enclosing one.
//    The depth bound keeps a hostile payload from exhausting the stack.
//  - A declared element count is only an upper bound: decoding stops at the end of the
//    input, and nothing is allocated in advance from a count.
//  - A hash key longer than 255 bytes is cut to its first 255 bytes (the key buffer holds
//    256 with the terminator); a key with an embedded NUL ends at the NUL.
//  - Duplicate keys keep the first position and the last value. Large hashes are
//    de-duplicated through a temporary index, so decoding stays linear in the input.
// On the encoding side a key longer than 65,535 bytes (the 16-bit length field) is cut.
#include <climits>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <string_view>
#include <unordered_map>

#include "common/log.h"
#include "common/value_internal.h"

namespace {

constexpr unsigned kMaxDepth = 256;
constexpr std::size_t kMaxKeyLength = 255;
constexpr std::size_t kMaxEncodedKeyLength = 0xFFFF;
// Hashes up to this size are de-duplicated by a plain scan.
constexpr int32_t kHashScanLimit = 16;
// Smallest encodings of an array element (tag and length) and of a hash entry (key
// length, empty key, tag and length); used to bound what a declared count reserves.
constexpr uint64_t kMinElementSize = 5;
constexpr uint64_t kMinEntrySize = 7;
constexpr uint64_t kMaxPresize = 1u << 16;

void put_be32(unsigned char *out, uint32_t v) {
    out[0] = static_cast<unsigned char>(v >> 24);
    out[1] = static_cast<unsigned char>(v >> 16);
    out[2] = static_cast<unsigned char>(v >> 8);
    out[3] = static_cast<unsigned char>(v);
}

uint32_t get_be32(const unsigned char *p) {
    return (static_cast<uint32_t>(p[0]) << 24) | (static_cast<uint32_t>(p[1]) << 16) |
           (static_cast<uint32_t>(p[2]) << 8) | p[3];
}

std::size_t encoded_key_length(const char *key) {
    std::size_t k = std::strlen(key);
    return k > kMaxEncodedKeyLength ? kMaxEncodedKeyLength : k;
}

// Exact encoded size in 64 bits, so that absurd trees are detected instead of wrapping.
uint64_t calc64(const gval *v) {
    if (v == nullptr) return 0;
    switch (v->type) {
        case SERIALIZE_INT:
        case SERIALIZE_FLOAT:
            return 6;
        case SERIALIZE_STRING:
        case SERIALIZE_BYTES:
        case SERIALIZE_STRUCT:
            return 5 + static_cast<uint64_t>(v->len);
        case SERIALIZE_ARRAY: {
            const gval_array *body = value_array_body(v);
            uint64_t size = 9;
            for (int32_t i = 0; i < body->count; ++i) size += calc64(body->items[i]);
            return size;
        }
        case SERIALIZE_HASH: {
            const gval_hash *body = value_hash_body(v);
            uint64_t size = 9;
            for (int32_t i = 0; i < body->count; ++i)
                size += 2 + encoded_key_length(body->keys[i]) + calc64(body->values[i]);
            return size;
        }
        default:
            return 0;
    }
}

uint32_t saturate(uint64_t size) {
    return size > UINT32_MAX ? UINT32_MAX : static_cast<uint32_t>(size);
}

uint32_t pack_any(unsigned char *out, const gval *v);

bool is_tag(unsigned char tag) {
    return tag == 'i' || tag == 'f' || tag == 's' || tag == 'b' || tag == 'a' || tag == 'h' ||
           tag == 't';
}

gval *decode_array(const unsigned char *p, uint64_t remaining, uint64_t *consumed, unsigned depth,
                   ValueKey *key);
gval *decode_hash(const unsigned char *p, uint64_t remaining, uint64_t *consumed, unsigned depth,
                  ValueKey *key);

// Set by any allocation that failed during the current decode on this thread. A short
// input ends a container quietly (that is what the daemon sent), but a tree cut short for
// want of memory would look just as whole: the public readers drop it and say so.
thread_local bool decode_out_of_memory = false;

template <class T>
T *allocated(T *p) {
    if (p == nullptr) decode_out_of_memory = true;
    return p;
}

bool allocated(bool ok) {
    if (!ok) decode_out_of_memory = true;
    return ok;
}

// key, when given, is the hash key under which the value is stored; it is copied into the
// value's own block (see ValueKey).
[[gnu::always_inline]] inline gval *decode_scalar(uint32_t kind, const unsigned char *p,
                                                  uint64_t remaining, uint64_t *consumed,
                                                  ValueKey *key) {
    if (remaining < 5) return nullptr;
    uint32_t bits = get_be32(p + 1);  // big-endian on the wire
    gval *v = allocated(value_new_blob(kind, &bits, 4, key));
    if (v != nullptr) *consumed += 1 + static_cast<uint64_t>(p[0]);
    return v;
}

[[gnu::always_inline]] inline gval *decode_blob(uint32_t kind, const unsigned char *p,
                                                uint64_t remaining, uint64_t *consumed,
                                                ValueKey *key) {
    if (remaining < 4) return nullptr;
    uint32_t n = get_be32(p);
    if (n > remaining - 4) return nullptr;
    gval *v = allocated(value_new_blob(kind, p + 4, n, key));
    if (v != nullptr) *consumed += 4 + static_cast<uint64_t>(n);
    return v;
}

// Decodes the value whose tag has just been read. Inside arrays an unknown tag is a struct.
gval *decode_tagged(unsigned char tag, const unsigned char *p, uint64_t remaining,
                    uint64_t *consumed, unsigned depth, ValueKey *key = nullptr) {
    switch (tag) {
        case 'i':
            return decode_scalar(SERIALIZE_INT, p, remaining, consumed, key);
        case 'f':
            return decode_scalar(SERIALIZE_FLOAT, p, remaining, consumed, key);
        case 's':
            return decode_blob(SERIALIZE_STRING, p, remaining, consumed, key);
        case 'b':
            return decode_blob(SERIALIZE_BYTES, p, remaining, consumed, key);
        case 'a':
            return decode_array(p, remaining, consumed, depth, key);
        case 'h':
            return decode_hash(p, remaining, consumed, depth, key);
        default:
            return decode_blob(SERIALIZE_STRUCT, p, remaining, consumed, key);
    }
}

// Reads the common container header: the declared count, 0 when the container is empty
// (count 0 or a truncated header, which counts as 8 bytes after the tag).
uint32_t container_count(const unsigned char *p, uint64_t remaining) {
    return remaining < 8 ? 0 : get_be32(p + 4);
}

// Room reserved up front for a container's declared count, bounded by what the input
// can hold (min_size bytes per element) so that a lying count costs nothing.
uint32_t plausible_count(uint32_t count, uint64_t remaining, uint64_t min_size) {
    uint64_t n = remaining / min_size;
    if (n > kMaxPresize) n = kMaxPresize;
    return count < n ? count : static_cast<uint32_t>(n);
}

gval *decode_array(const unsigned char *p, uint64_t remaining, uint64_t *consumed, unsigned depth,
                   ValueKey *key) {
    if (depth > kMaxDepth) return nullptr;
    const uint32_t count = container_count(p, remaining);
    gval *array =
        allocated(value_new_array(plausible_count(count, remaining, kMinElementSize), key));
    if (array == nullptr) return nullptr;
    uint64_t pos = 8;
    for (uint32_t i = 0; i < count && pos < remaining; ++i) {
        uint64_t used = 0;
        gval *item = decode_tagged(p[pos], p + pos + 1, remaining - pos - 1, &used, depth + 1);
        if (item == nullptr) break;
        gval_array *body = value_array_body(array);
        if (body->count < body->capacity)  // the usual case: the room was reserved above
            body->items[body->count++] = item;
        else if (!allocated(serialize_array_add(array, item) == 0))
            break;
        pos += 1 + used;
    }
    *consumed += pos;
    return array;
}

// Finds keys already present in a hash under construction. Small hashes are scanned,
// comparing lengths before bytes; larger ones get a temporary index whose keys point at
// the hash's own key texts (re-pointed when a duplicate replaces an entry's key).
class KeyIndex {
  public:
    // Entry index of key, -1 when absent, -2 when out of memory.
    int32_t find(const gval_hash *body, std::string_view key) {
        if (body->count <= kHashScanLimit) {
            last_mark_ = mark(key);
            if ((seen_ & last_mark_) == 0) return -1;  // no key of this length and start yet
            for (int32_t i = 0; i < body->count; ++i)
                if (lengths_[i] == key.size() &&
                    std::memcmp(body->keys[i], key.data(), key.size()) == 0)
                    return i;
            return -1;
        }
        try {
            for (; indexed_ < body->count; ++indexed_)
                index_.emplace(body->keys[indexed_], indexed_);
        } catch (...) {
            return -2;
        }
        auto it = index_.find(key);
        return it == index_.end() ? -1 : it->second;
    }

    // Entry `index` was just added with key, the last one find() was asked about.
    void added(int32_t index, std::string_view key) {
        if (index < 0 || index >= kHashScanLimit) return;
        lengths_[index] = static_cast<uint16_t>(key.size());
        seen_ |= last_mark_;
    }

    // Entry `index` is about to take new_key (equal bytes) in place of its current key,
    // which is released: the index must stop pointing at the old text.
    void rekey(const gval_hash *body, int32_t index, const char *new_key) {
        if (index >= indexed_) return;
        auto node = index_.extract(std::string_view(body->keys[index]));
        if (node.empty()) return;
        node.key() = std::string_view(new_key, node.key().size());
        index_.insert(std::move(node));
    }

  private:
    // One of 64 bits for a key's length and first byte: a small hash's keys almost always
    // differ in these, so most new keys are known to be new without a scan.
    static uint64_t mark(std::string_view key) {
        const unsigned first = key.empty() ? 0u : static_cast<unsigned char>(key[0]);
        return uint64_t{1} << ((key.size() * 7 + first) & 63);
    }

    uint64_t seen_ = 0;
    uint64_t last_mark_ = 0;
    uint16_t lengths_[kHashScanLimit] = {};
    std::unordered_map<std::string_view, int32_t> index_;
    int32_t indexed_ = 0;
};

// Length of a key as kept: at most kMaxKeyLength bytes, ending at a NUL.
std::size_t key_length_kept(const unsigned char *bytes, uint64_t length) {
    std::size_t n = length > kMaxKeyLength ? kMaxKeyLength : static_cast<std::size_t>(length);
    const void *nul = std::memchr(bytes, 0, n);
    return nul == nullptr
               ? n
               : static_cast<std::size_t>(static_cast<const unsigned char *>(nul) - bytes);
}

gval *decode_hash(const unsigned char *p, uint64_t remaining, uint64_t *consumed, unsigned depth,
                  ValueKey *own_key) {
    if (depth > kMaxDepth) return nullptr;
    const uint32_t count = container_count(p, remaining);
    gval *hash =
        allocated(value_new_hash(plausible_count(count, remaining, kMinEntrySize), own_key));
    if (hash == nullptr) return nullptr;
    uint64_t pos = 8;
    KeyIndex keys;
    for (uint32_t i = 0; i < count && pos < remaining; ++i) {
        if (remaining - pos < 2) break;
        uint64_t key_length = (static_cast<uint64_t>(p[pos]) << 8) | p[pos + 1];
        // the key and the value's tag must be there
        if (remaining - pos - 2 < key_length + 1) break;
        const unsigned char *key_bytes = p + pos + 2;
        pos += 2 + key_length;
        unsigned char tag = p[pos++];
        if (!is_tag(tag)) continue;  // unknown value kind: the entry is dropped
        ValueKey key;
        key.bytes = reinterpret_cast<const char *>(key_bytes);
        key.length = key_length_kept(key_bytes, key_length);
        uint64_t used = 0;
        gval *value = decode_tagged(tag, p + pos, remaining - pos, &used, depth + 1, &key);
        if (value == nullptr) break;
        pos += used;
        gval_hash *body = value_hash_body(hash);
        const std::string_view text(key.stored, key.length);
        int32_t at = keys.find(body, text);
        if (at >= 0) {
            keys.rekey(body, at, key.stored);
            value_hash_replace_inline(hash, at, value, key.stored);
            continue;
        }
        if (at == -2) {
            decode_out_of_memory = true;
            serialize_free(value);
            break;
        }
        if (body->count < body->capacity) {  // the usual case: the room was reserved above
            at = body->count++;
            body->keys[at] = key.stored;
            body->values[at] = value;
        } else {
            at = value_hash_append_inline(hash, value, key.stored);
            if (!allocated(at >= 0)) break;
        }
        keys.added(at, text);
    }
    *consumed += pos;
    return hash;
}

// Public readers report consumption in 32 bits; a container's reported size can exceed
// the input it was given only when an int claims a size byte beyond it.
template <class Decode>
gval *public_reader(uint32_t *consumed, Decode &&decode) {
    uint64_t used = 0;
    decode_out_of_memory = false;
    gval *v = decode(&used);
    if (decode_out_of_memory) {
        ZAL_LOGE("unserialize: out of memory, value dropped\n");
        serialize_free(v);
        return nullptr;
    }
    if (v != nullptr && consumed != nullptr) *consumed += static_cast<uint32_t>(used);
    return v;
}

}  // namespace

extern "C" {

ZAL_API uint32_t serialize_pack_calc(const gval *v) {
    return saturate(calc64(v));
}
ZAL_API uint32_t serialize_int_pack_calc(void) {
    return 6;
}
ZAL_API uint32_t serialize_float_pack_calc(void) {
    return 6;
}
ZAL_API uint32_t serialize_string_pack_calc(const gval *v) {
    return saturate(5 + static_cast<uint64_t>(v->len));
}
ZAL_API uint32_t serialize_bytes_pack_calc(const gval *v) {
    return serialize_string_pack_calc(v);
}
ZAL_API uint32_t serialize_array_pack_calc(const gval *v) {
    return saturate(calc64(v));
}
ZAL_API uint32_t serialize_hash_pack_calc(const gval *v) {
    return saturate(calc64(v));
}

ZAL_API uint32_t serialize_int_pack(unsigned char *out, const gval *v) {
    out[0] = v->type == SERIALIZE_FLOAT ? 'f' : 'i';
    out[1] = 4;
    uint32_t bits;
    std::memcpy(&bits, v->data, 4);
    put_be32(out + 2, bits);
    return 6;
}

ZAL_API uint32_t serialize_float_pack(unsigned char *out, const gval *v) {
    uint32_t n = serialize_int_pack(out, v);
    out[0] = 'f';
    return n;
}

ZAL_API uint32_t serialize_string_pack(unsigned char *out, const gval *v, int kind) {
    out[0] = kind == SERIALIZE_STRING ? 's' : kind == SERIALIZE_BYTES ? 'b' : 't';
    put_be32(out + 1, v->len);
    if (v->len > 0) std::memcpy(out + 5, v->data, v->len);
    return 5 + v->len;
}

ZAL_API uint32_t serialize_array_pack(unsigned char *out, const gval *v) {
    const gval_array *body = value_array_body(v);
    uint32_t pos = 9;
    out[0] = 'a';
    put_be32(out + 5, static_cast<uint32_t>(body->count));
    for (int32_t i = 0; i < body->count; ++i) pos += pack_any(out + pos, body->items[i]);
    put_be32(out + 1, pos - 5);
    return pos;
}

ZAL_API uint32_t serialize_hash_pack(unsigned char *out, const gval *v) {
    const gval_hash *body = value_hash_body(v);
    uint32_t pos = 9;
    out[0] = 'h';
    put_be32(out + 5, static_cast<uint32_t>(body->count));
    for (int32_t i = 0; i < body->count; ++i) {
        std::size_t k = encoded_key_length(body->keys[i]);
        out[pos] = static_cast<unsigned char>(k >> 8);
        out[pos + 1] = static_cast<unsigned char>(k);
        std::memcpy(out + pos + 2, body->keys[i], k);
        pos += 2 + static_cast<uint32_t>(k);
        pos += pack_any(out + pos, body->values[i]);
    }
    put_be32(out + 1, pos - 5);
    return pos;
}

ZAL_API unsigned char *serialize(const gval *v, uint32_t *len) {
    uint64_t size = calc64(v);
    if (size == 0 || size > UINT32_MAX) {
        if (size != 0)
            ZAL_LOGE("%s: value too large to encode (%llu bytes)\n", __func__,
                     static_cast<unsigned long long>(size));
        if (len != nullptr) *len = 0;
        return nullptr;
    }
    // The writers fill every byte that the size calculation counted, so the buffer needs
    // no zero-filling (it would cost a fifth of encoding a picture).
    auto *out = static_cast<unsigned char *>(std::malloc(static_cast<std::size_t>(size)));
    if (out == nullptr) {
        ZAL_LOGE("%s: out of memory (%llu bytes)\n", __func__,
                 static_cast<unsigned long long>(size));
        if (len != nullptr) *len = 0;
        return nullptr;
    }
    pack_any(out, v);
    if (len != nullptr) *len = static_cast<uint32_t>(size);
    return out;
}

ZAL_API gval *unserialize(const unsigned char *buf, uint32_t len) {
    if (buf == nullptr || len == 0 || !is_tag(buf[0])) return nullptr;
    return public_reader(
        nullptr, [&](uint64_t *used) { return decode_tagged(buf[0], buf + 1, len - 1, used, 1); });
}

ZAL_API gval *serialize_int_unpack(const unsigned char *p, uint32_t remaining, uint32_t *consumed) {
    return public_reader(consumed, [&](uint64_t *used) {
        return decode_scalar(SERIALIZE_INT, p, remaining, used, nullptr);
    });
}

ZAL_API gval *serialize_float_unpack(const unsigned char *p, uint32_t remaining,
                                     uint32_t *consumed) {
    return public_reader(consumed, [&](uint64_t *used) {
        return decode_scalar(SERIALIZE_FLOAT, p, remaining, used, nullptr);
    });
}

ZAL_API gval *serialize_string_unpack(const unsigned char *p, uint32_t remaining,
                                      uint32_t *consumed, int kind) {
    uint32_t k = kind == SERIALIZE_STRING || kind == SERIALIZE_BYTES
                     ? static_cast<uint32_t>(kind)
                     : static_cast<uint32_t>(SERIALIZE_STRUCT);
    return public_reader(
        consumed, [&](uint64_t *used) { return decode_blob(k, p, remaining, used, nullptr); });
}

ZAL_API gval *serialize_array_unpack(const unsigned char *p, uint32_t remaining,
                                     uint32_t *consumed) {
    return public_reader(
        consumed, [&](uint64_t *used) { return decode_array(p, remaining, used, 1, nullptr); });
}

ZAL_API gval *serialize_hash_unpack(const unsigned char *p, uint32_t remaining,
                                    uint32_t *consumed) {
    return public_reader(
        consumed, [&](uint64_t *used) { return decode_hash(p, remaining, used, 1, nullptr); });
}

}  // extern "C"

namespace {
uint32_t pack_any(unsigned char *out, const gval *v) {
    if (v == nullptr) return 0;
    switch (v->type) {
        case SERIALIZE_INT:
            return serialize_int_pack(out, v);
        case SERIALIZE_FLOAT:
            return serialize_float_pack(out, v);
        case SERIALIZE_STRING:
        case SERIALIZE_BYTES:
        case SERIALIZE_STRUCT:
            return serialize_string_pack(out, v, static_cast<int>(v->type));
        case SERIALIZE_ARRAY:
            return serialize_array_pack(out, v);
        case SERIALIZE_HASH:
            return serialize_hash_pack(out, v);
        default:
            return 0;
    }
}
}  // namespace

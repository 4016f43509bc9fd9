// Encode and decode-and-free times of our codec against msgpack-c, on payloads shaped
// like the daemon's real traffic. msgpack-c encodes from a msgpack_object tree holding the
// same data; its decode baseline copies strings and byte strings so that, like ours, the
// decoded tree owns its data (the zero-copy C decoder is shown for information). After the runs a
// table gives our time divided by msgpack-c's for each payload (targets: encode <= 1.0,
// decode-and-free <= 2.0). Beside each decode ratio it shows what the allocator alone costs
// for the decoded tree's blocks, relative to the same baseline: the value layout gives every
// scalar and blob a heap block of its own, so that share is the floor of our ratio.
#define MSGPACK_NO_BOOST 1
#include <benchmark/benchmark.h>
#include <msgpack.h>

#include <msgpack.hpp>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "bench_support.h"
#include "zal-ipod-2/serialize.h"

namespace {

// ---- payloads -------------------------------------------------------------------------

gval *device_list() {
    gval *list = serialize_array();
    for (int i = 0; i < 4; ++i) {
        gval *d = serialize_hash();
        std::string serial = "F2LXK0" + std::to_string(1000 + i) + "HG7Q";
        serialize_hash_add(d, "serial", serialize_string(serial.c_str()));
        serialize_hash_add(d, "name", serialize_string(i % 2 ? "Pixel's iPhone" : "Car iPod"));
        serialize_hash_add(d, "authenticated", serialize_int(1));
        serialize_hash_add(d, "used", serialize_int(i == 0));
        serialize_hash_add(d, "extended", serialize_int(0));
        serialize_hash_add(d, "protocolinuse", serialize_int(2));
        serialize_hash_add(d, "transport", serialize_string(i < 2 ? "usb" : "bluetooth"));
        serialize_hash_add(d, "bus", serialize_int(i + 1));
        serialize_hash_add(d, "address", serialize_string("00:1A:7D:DA:71:13"));
        serialize_hash_add(d, "rfcommId", serialize_int(3 + i));
        serialize_array_add(list, d);
    }
    return list;
}

gval *item_list() {
    gval *list = serialize_array();
    serialize_array_add(list, serialize_int(8000));
    unsigned seed = 12345;
    std::string name;
    for (int i = 0; i < 8000; ++i) {
        seed = seed * 1103515245u + 12345u;
        size_t n = 12 + (seed >> 16) % 29;  // 12 .. 40 characters
        name.assign(n, ' ');
        for (size_t k = 0; k < n; ++k) name[k] = static_cast<char>('a' + (seed >> (k % 16)) % 26);
        serialize_array_add(list, serialize_string(name.c_str()));
    }
    return list;
}

gval *track_info() {
    gval *h = serialize_hash();
    serialize_hash_add(h, "title", serialize_string("Shine On You Crazy Diamond (Parts I-V)"));
    serialize_hash_add(h, "artist", serialize_string("The Band With A Long Name"));
    serialize_hash_add(h, "album", serialize_string("Wish You Were Here"));
    serialize_hash_add(h, "genre", serialize_string("Progressive Rock"));
    serialize_hash_add(h, "composer", serialize_string("Gilmour, Waters, Wright"));
    serialize_hash_add(h, "duration", serialize_int(811000));
    serialize_hash_add(h, "position", serialize_int(123456));
    serialize_hash_add(h, "track_index", serialize_int(4));
    serialize_hash_add(h, "track_count", serialize_int(12));
    serialize_hash_add(h, "chapter_count", serialize_int(0));
    serialize_hash_add(h, "play_state", serialize_int(1));
    serialize_hash_add(h, "shuffle", serialize_int(0));
    serialize_hash_add(h, "repeat", serialize_int(2));
    serialize_hash_add(h, "uid", serialize_bytes("\x01\x23\x45\x67\x89\xab\xcd\xef", 8));
    return h;
}

gval *artwork_reply() {
    std::vector<unsigned char> image(320 * 320 * 2);
    for (size_t i = 0; i < image.size(); ++i) image[i] = static_cast<unsigned char>(i * 31);
    gval *h = serialize_hash();
    serialize_hash_add(h, "format", serialize_int(2));
    serialize_hash_add(h, "width", serialize_int(320));
    serialize_hash_add(h, "height", serialize_int(320));
    serialize_hash_add(h, "stride", serialize_int(640));
    serialize_hash_add(h, "data",
                       serialize_bytes(image.data(), static_cast<uint32_t>(image.size())));
    return h;
}

gval *event() {
    gval *data = serialize_hash();
    serialize_hash_add(data, "RemoteID", serialize_string("+49301234567"));
    serialize_hash_add(data, "DisplayName", serialize_string("Alex Example"));
    serialize_hash_add(data, "Status", serialize_int(3));
    serialize_hash_add(data, "Direction", serialize_int(1));
    serialize_hash_add(data, "CallUUID", serialize_string("6f1c2d2e-8a41-4c1e-9d55-0c3b2a1f9e77"));
    serialize_hash_add(data, "AddressBookID", serialize_string("4711"));
    gval *h = serialize_hash();
    serialize_hash_add(h, "event", serialize_string("telephony_callstate_information"));
    serialize_hash_add(h, "session", serialize_int(1));
    serialize_hash_add(h, "serial", serialize_string("F2LXK01000HG7Q"));
    serialize_hash_add(h, "data", data);
    return h;
}

// ---- the same tree as a msgpack object ------------------------------------------------

void to_msgpack(const gval *v, msgpack_object *o, msgpack_zone *zone) {
    switch (serialize_type(v)) {
        case SERIALIZE_INT: {
            int32_t i = serialize_get_int(v);
            o->type = i < 0 ? MSGPACK_OBJECT_NEGATIVE_INTEGER : MSGPACK_OBJECT_POSITIVE_INTEGER;
            o->via.i64 = i;
            break;
        }
        case SERIALIZE_FLOAT:
            o->type = MSGPACK_OBJECT_FLOAT32;
            o->via.f64 = serialize_get_float(v);
            break;
        case SERIALIZE_STRING:
            o->type = MSGPACK_OBJECT_STR;
            o->via.str.ptr = serialize_get_string(v);
            o->via.str.size = v->len;
            break;
        case SERIALIZE_BYTES:
        case SERIALIZE_STRUCT:
            o->type = MSGPACK_OBJECT_BIN;
            o->via.bin.ptr = static_cast<const char *>(v->data);
            o->via.bin.size = v->len;
            break;
        case SERIALIZE_ARRAY: {
            uint32_t n = static_cast<uint32_t>(serialize_array_count(v));
            o->type = MSGPACK_OBJECT_ARRAY;
            o->via.array.size = n;
            o->via.array.ptr = static_cast<msgpack_object *>(
                msgpack_zone_malloc(zone, sizeof(msgpack_object) * n));
            for (uint32_t i = 0; i < n; ++i)
                to_msgpack(serialize_array_get(v, i), &o->via.array.ptr[i], zone);
            break;
        }
        case SERIALIZE_HASH: {
            uint32_t n = static_cast<uint32_t>(serialize_hash_count(v));
            o->type = MSGPACK_OBJECT_MAP;
            o->via.map.size = n;
            o->via.map.ptr = static_cast<msgpack_object_kv *>(
                msgpack_zone_malloc(zone, sizeof(msgpack_object_kv) * n));
            const gval_hash *body = static_cast<const gval_hash *>(v->data);
            for (uint32_t i = 0; i < n; ++i) {
                msgpack_object_kv *kv = &o->via.map.ptr[i];
                kv->key.type = MSGPACK_OBJECT_STR;
                kv->key.via.str.ptr = body->keys[i];
                kv->key.via.str.size = static_cast<uint32_t>(std::strlen(body->keys[i]));
                to_msgpack(body->values[i], &kv->val, zone);
            }
            break;
        }
        default:
            o->type = MSGPACK_OBJECT_NIL;
            break;
    }
}

struct Payload {
    const char *name;
    gval *(*make)();
};
const Payload kPayloads[] = {
    {"device_list", device_list}, {"item_list", item_list}, {"track_info", track_info},
    {"artwork", artwork_reply},   {"event", event},
};

void ours_encode(benchmark::State &state, const Payload *p) {
    gval *v = p->make();
    for (auto _ : state) {
        uint32_t len = 0;
        unsigned char *buf = serialize(v, &len);
        benchmark::DoNotOptimize(buf);
        free(buf);
    }
    serialize_free(v);
}

void ours_decode(benchmark::State &state, const Payload *p) {
    gval *v = p->make();
    uint32_t len = 0;
    unsigned char *buf = serialize(v, &len);
    for (auto _ : state) {
        gval *back = unserialize(buf, len);
        benchmark::DoNotOptimize(back);
        serialize_free(back);
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * len);
    free(buf);
    serialize_free(v);
}

// The heap blocks of a decoded tree, in the order decoding allocates them: a record with its
// payload per scalar or blob (with room for its key inside a hash), and a record, a body and
// the pointer arrays per container.
void block_sizes(const gval *v, std::size_t key_length, std::vector<std::size_t> *sizes) {
    const std::size_t key_room = key_length > 0 ? 8 + key_length : 0;
    switch (serialize_type(v)) {
        case SERIALIZE_ARRAY: {
            const auto *body = static_cast<const gval_array *>(v->data);
            sizes->insert(sizes->end(), {sizeof(gval_array),
                                         static_cast<std::size_t>(body->capacity) * sizeof(gval *),
                                         sizeof(gval) + key_room});
            for (int32_t i = 0; i < body->count; ++i) block_sizes(body->items[i], 0, sizes);
            break;
        }
        case SERIALIZE_HASH: {
            const auto *body = static_cast<const gval_hash *>(v->data);
            const std::size_t pointers = static_cast<std::size_t>(body->capacity) * sizeof(void *);
            sizes->insert(sizes->end(),
                          {sizeof(gval_hash), pointers, pointers, sizeof(gval) + key_room});
            for (int32_t i = 0; i < body->count; ++i)
                block_sizes(body->values[i], std::strlen(body->keys[i]) + 1, sizes);
            break;
        }
        default:
            sizes->push_back(sizeof(gval) + v->len + 1 + key_room);
            break;
    }
}

// What the allocator alone costs for such a tree: malloc every block, then free them all.
// This is the floor under our decode-and-free, which no parsing can go below.
void allocations_only(benchmark::State &state, const Payload *p) {
    gval *v = p->make();
    uint32_t len = 0;
    unsigned char *buf = serialize(v, &len);
    gval *decoded = unserialize(buf, len);
    std::vector<std::size_t> sizes;
    block_sizes(decoded, 0, &sizes);
    std::vector<void *> blocks(sizes.size());
    for (auto _ : state) {
        for (std::size_t i = 0; i < sizes.size(); ++i) blocks[i] = malloc(sizes[i]);
        benchmark::DoNotOptimize(blocks.data());
        for (void *b : blocks) free(b);
    }
    serialize_free(decoded);
    free(buf);
    serialize_free(v);
}

// A payload as msgpack-c takes it: the same tree as a msgpack object (in a zone), and the
// bytes msgpack-c packs it into.
class MsgpackPayload {
  public:
    explicit MsgpackPayload(const Payload *p) : value_(p->make()) {
        msgpack_zone_init(&zone_, 4096);
        to_msgpack(value_, &object, &zone_);
        msgpack_sbuffer_init(&packed);
        msgpack_packer pk;
        msgpack_packer_init(&pk, &packed, msgpack_sbuffer_write);
        msgpack_pack_object(&pk, object);
    }
    ~MsgpackPayload() {
        msgpack_sbuffer_destroy(&packed);
        msgpack_zone_destroy(&zone_);
        serialize_free(value_);
    }
    MsgpackPayload(const MsgpackPayload &) = delete;
    MsgpackPayload &operator=(const MsgpackPayload &) = delete;

    msgpack_object object;
    msgpack_sbuffer packed;

  private:
    gval *value_;
    msgpack_zone zone_;
};

void msgpack_encode(benchmark::State &state, const Payload *p) {
    MsgpackPayload m(p);
    for (auto _ : state) {
        msgpack_sbuffer sbuf;
        msgpack_sbuffer_init(&sbuf);
        msgpack_packer pk;
        msgpack_packer_init(&pk, &sbuf, msgpack_sbuffer_write);
        msgpack_pack_object(&pk, m.object);
        benchmark::DoNotOptimize(sbuf.data);
        msgpack_sbuffer_destroy(&sbuf);
    }
}

void msgpack_decode(benchmark::State &state, const Payload *p) {
    MsgpackPayload m(p);
    for (auto _ : state) {
        msgpack_unpacked result;
        msgpack_unpacked_init(&result);
        size_t off = 0;
        if (msgpack_unpack_next(&result, m.packed.data, m.packed.size, &off) !=
            MSGPACK_UNPACK_SUCCESS)
            state.SkipWithError("msgpack decode failed");
        benchmark::DoNotOptimize(result.data);
        msgpack_unpacked_destroy(&result);
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * m.packed.size));
}

// msgpack-c's C decoder points strings and byte strings into the input buffer; this
// baseline makes it copy them into its zone, so that the result owns its data like ours.
void msgpack_decode_copy(benchmark::State &state, const Payload *p) {
    MsgpackPayload m(p);
    auto never_reference = [](msgpack::type::object_type, std::size_t, void *) { return false; };
    for (auto _ : state) {
        msgpack::object_handle oh = msgpack::unpack(m.packed.data, m.packed.size, never_reference);
        benchmark::DoNotOptimize(oh.get().type);
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * m.packed.size));
}

}  // namespace

int main(int argc, char **argv) {
    for (const Payload &p : kPayloads) {
        std::string n = p.name;
        benchmark::RegisterBenchmark(("encode/ours/" + n).c_str(), ours_encode, &p);
        benchmark::RegisterBenchmark(("encode/msgpack/" + n).c_str(), msgpack_encode, &p);
        benchmark::RegisterBenchmark(("decode_free/ours/" + n).c_str(), ours_decode, &p);
        benchmark::RegisterBenchmark(("decode_free/msgpack/" + n).c_str(), msgpack_decode_copy, &p);
        benchmark::RegisterBenchmark(("decode_free/msgpack_zero_copy/" + n).c_str(), msgpack_decode,
                                     &p);
        benchmark::RegisterBenchmark(("decode_free/allocations/" + n).c_str(), allocations_only,
                                     &p);
    }
    const zalbench::Times times = zalbench::run_benchmarks(&argc, argv);

    const struct {
        const char *op;
        double target;
    } ops[] = {{"encode", 1.0}, {"decode_free", 2.0}};
    int missed = 0;
    printf("\n%-14s %-12s %12s %12s %7s %s\n", "operation", "payload", "ours", "msgpack-c", "ratio",
           "target");
    for (const auto &op : ops) {
        for (const Payload &p : kPayloads) {
            std::string suffix = std::string("/") + p.name;
            auto ours = times.find(std::string(op.op) + "/ours" + suffix);
            auto base = times.find(std::string(op.op) + "/msgpack" + suffix);
            if (ours == times.end() || base == times.end()) continue;
            auto zero_copy = times.find(std::string(op.op) + "/msgpack_zero_copy" + suffix);
            double ratio = ours->second / base->second;
            bool ok = ratio <= op.target;
            missed += !ok;
            printf("%-14s %-12s %12.0f %12.0f %7.2f <= %.1f %-6s", op.op, p.name, ours->second,
                   base->second, ratio, op.target, ok ? "" : "MISSED");
            if (zero_copy != times.end())
                printf("  (%.2f against msgpack-c zero-copy)", ours->second / zero_copy->second);
            auto floor = times.find(std::string(op.op) + "/allocations" + suffix);
            if (floor != times.end())
                printf("  (the tree's mallocs and frees alone: %.2f)",
                       floor->second / base->second);
            printf("\n");
        }
    }
    printf("(times in %s per operation)\n", "ns");
    benchmark::Shutdown();
    return 0;
}

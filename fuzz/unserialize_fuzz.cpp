// Fuzzes the wire decoder: any input must decode without a fault or a leak, and the
// encoding of what was decoded must be stable (decode -> encode -> decode -> encode gives
// the same bytes twice).
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "zal-ipod-2/serialize.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    if (size > UINT32_MAX) return 0;
    gval *first = unserialize(data, static_cast<uint32_t>(size));
    if (first == nullptr) return 0;

    uint32_t len1 = 0;
    unsigned char *enc1 = serialize(first, &len1);
    if (enc1 == nullptr) abort();
    gval *second = unserialize(enc1, len1);
    if (second == nullptr) abort();
    uint32_t len2 = 0;
    unsigned char *enc2 = serialize(second, &len2);
    if (enc2 == nullptr || len1 != len2 || std::memcmp(enc1, enc2, len1) != 0) {
        fprintf(stderr, "re-encoding differs: %u vs %u bytes\n", len1, len2);
        abort();
    }
    free(enc1);
    free(enc2);
    serialize_free(first);
    serialize_free(second);
    return 0;
}

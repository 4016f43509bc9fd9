// The wire encoding is big-endian whatever the host's byte order and alignment rules:
// exact bytes for scalars and lengths, round trips of sign-bit and float bit patterns,
// and decoding from a buffer at an odd address.
#include <gtest/gtest.h>

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <vector>

#include "zal-ipod-2/serialize.h"

namespace {

struct ValueDeleter {
    void operator()(gval *v) const { serialize_free(v); }
};
using Value = std::unique_ptr<gval, ValueDeleter>;

std::vector<unsigned char> encode(const gval *v) {
    uint32_t len = 0;
    unsigned char *buf = serialize(v, &len);
    EXPECT_NE(buf, nullptr);
    std::vector<unsigned char> out(buf, buf + (buf ? len : 0));
    std::free(buf);
    return out;
}

// Decodes from a copy placed at an odd address, so that no field is naturally aligned.
Value decode_misaligned(const std::vector<unsigned char> &wire) {
    std::vector<unsigned char> storage(wire.size() + 1);
    std::memcpy(storage.data() + 1, wire.data(), wire.size());
    return Value(unserialize(storage.data() + 1, static_cast<uint32_t>(wire.size())));
}

struct IntCase {
    int32_t value;
    unsigned char wire[4];
};

const IntCase kIntCases[] = {
    {INT32_MIN, {0x80, 0x00, 0x00, 0x00}},  // 0x80000000: the sign bit alone
    {-2, {0xFF, 0xFF, 0xFF, 0xFE}},         {-1, {0xFF, 0xFF, 0xFF, 0xFF}},
    {0x01020304, {0x01, 0x02, 0x03, 0x04}}, {INT32_MAX, {0x7F, 0xFF, 0xFF, 0xFF}},
    {0, {0x00, 0x00, 0x00, 0x00}},
};

TEST(CodecByteOrder, IntsAreBigEndianAndRoundTrip) {
    for (const IntCase &c : kIntCases) {
        SCOPED_TRACE(c.value);
        Value v(serialize_int(c.value));
        ASSERT_NE(v, nullptr);
        auto wire = encode(v.get());
        const std::vector<unsigned char> expected = {'i',       4,         c.wire[0],
                                                     c.wire[1], c.wire[2], c.wire[3]};
        EXPECT_EQ(wire, expected);
        Value back = decode_misaligned(wire);
        ASSERT_NE(back, nullptr);
        ASSERT_EQ(serialize_type(back.get()), SERIALIZE_INT);
        EXPECT_EQ(serialize_get_int(back.get()), c.value);
    }
}

// Floats travel as their IEEE-754 bit pattern; comparing bits also covers NaN payloads,
// negative zero and subnormals, which a conversion through another type would change.
const uint32_t kFloatBits[] = {
    0x3F800000u,  // 1.0
    0xC0200000u,  // -2.5
    0x80000000u,  // -0.0
    0x00000001u,  // smallest subnormal
    0x7F7FFFFFu,  // largest finite
    0x7F800000u,  // +infinity
    0x7FC00001u,  // quiet NaN with a payload
};

TEST(CodecByteOrder, FloatBitPatternsAreBigEndianAndRoundTrip) {
    for (uint32_t bits : kFloatBits) {
        SCOPED_TRACE(::testing::Message() << std::hex << bits);
        float f;
        std::memcpy(&f, &bits, sizeof f);
        Value v(serialize_float(f));
        ASSERT_NE(v, nullptr);
        auto wire = encode(v.get());
        const std::vector<unsigned char> expected = {'f',
                                                     4,
                                                     static_cast<unsigned char>(bits >> 24),
                                                     static_cast<unsigned char>(bits >> 16),
                                                     static_cast<unsigned char>(bits >> 8),
                                                     static_cast<unsigned char>(bits)};
        EXPECT_EQ(wire, expected);
        Value back = decode_misaligned(wire);
        ASSERT_NE(back, nullptr);
        ASSERT_EQ(serialize_type(back.get()), SERIALIZE_FLOAT);
        float g = serialize_get_float(back.get());
        uint32_t back_bits;
        std::memcpy(&back_bits, &g, sizeof back_bits);
        EXPECT_EQ(back_bits, bits);
    }
}

// Lengths are 32-bit big-endian too; 0x0102 puts different bytes in both low positions.
TEST(CodecByteOrder, BlobLengthIsBigEndian) {
    std::vector<unsigned char> payload(0x0102, 0x5A);
    Value v(serialize_bytes(payload.data(), static_cast<uint32_t>(payload.size())));
    ASSERT_NE(v, nullptr);
    auto wire = encode(v.get());
    ASSERT_EQ(wire.size(), 5 + payload.size());
    EXPECT_EQ(wire[0], 'b');
    EXPECT_EQ(std::vector<unsigned char>(wire.begin() + 1, wire.begin() + 5),
              (std::vector<unsigned char>{0x00, 0x00, 0x01, 0x02}));
    Value back = decode_misaligned(wire);
    ASSERT_NE(back, nullptr);
    uint32_t len = 0;
    const void *p = serialize_get_bytes(back.get(), &len);
    ASSERT_EQ(len, payload.size());
    EXPECT_EQ(std::memcmp(p, payload.data(), len), 0);
}

// A container puts every field at an odd offset: ints and floats inside a hash inside an
// array decode to the same values from a misaligned buffer.
TEST(CodecByteOrder, NestedScalarsAtOddOffsetsRoundTrip) {
    Value root(serialize_array());
    ASSERT_NE(root, nullptr);
    gval *h = serialize_hash();
    ASSERT_EQ(serialize_hash_add(h, "x", serialize_int(INT32_MIN)), 0);
    ASSERT_EQ(serialize_hash_add(h, "yy", serialize_float(-2.5f)), 0);
    ASSERT_EQ(serialize_array_add(root.get(), serialize_int(-2)), 0);
    ASSERT_EQ(serialize_array_add(root.get(), h), 0);

    Value back = decode_misaligned(encode(root.get()));
    ASSERT_NE(back, nullptr);
    ASSERT_EQ(serialize_array_count(back.get()), 2);
    EXPECT_EQ(serialize_get_int(serialize_array_get(back.get(), 0)), -2);
    const gval *bh = serialize_array_get(back.get(), 1);
    ASSERT_EQ(serialize_type(bh), SERIALIZE_HASH);
    ASSERT_NE(serialize_hash_get(bh, "x"), nullptr);
    EXPECT_EQ(serialize_get_int(serialize_hash_get(bh, "x")), INT32_MIN);
    ASSERT_NE(serialize_hash_get(bh, "yy"), nullptr);
    EXPECT_EQ(serialize_get_float(serialize_hash_get(bh, "yy")), -2.5f);
}

}  // namespace

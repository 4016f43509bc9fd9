// Wire encoding: exact bytes of known values, round trips, and decoding of hostile input.
#include <gtest/gtest.h>

#include <cstring>
#include <functional>
#include <string>

#include "value_builders.h"

using zaltest::Bytes;
using zaltest::decode;
using zaltest::encode;
using zaltest::GvalPtr;
using zaltest::hex;

namespace {

gval *array_of(std::initializer_list<gval *> items) {
    gval *a = serialize_array();
    for (gval *i : items) serialize_array_add(a, i);
    return a;
}

struct EncodeCase {
    const char *name;
    std::function<gval *()> make;
    const char *bytes;
};

const EncodeCase kEncodeCases[] = {
    {"negative_int", [] { return serialize_int(-2); }, "69 04 FF FF FF FE"},
    {"int_min", [] { return serialize_int(INT32_MIN); }, "69 04 80 00 00 00"},
    {"float", [] { return serialize_float(1.5f); }, "66 04 3F C0 00 00"},
    {"empty_string", [] { return serialize_string(""); }, "73 00 00 00 00"},
    {"bytes", [] { return serialize_bytes("\x00\x01\x02", 3); }, "62 00 00 00 03 00 01 02"},
    {"struct", [] { return serialize_struct("\x00\x01\x02", 3); }, "74 00 00 00 03 00 01 02"},
    {"empty_bytes", [] { return serialize_bytes(nullptr, 0); }, "62 00 00 00 00"},
    {"empty_array", [] { return serialize_array(); }, "61 00 00 00 04 00 00 00 00"},
    {"empty_hash", [] { return serialize_hash(); }, "68 00 00 00 04 00 00 00 00"},
    {"device_hash", zaltest::make_device_hash,
     "68 00 00 00 2A 00 00 00 02 00 06 73 65 72 69 61 6C 73 00 00 00 04 61 62 31 32"
     " 00 0D 61 75 74 68 65 6E 74 69 63 61 74 65 64 69 04 00 00 00 01"},
    {"array_of_strings",
     [] {
         return array_of({serialize_string("key"), serialize_string("value")});
     },
     "61 00 00 00 16 00 00 00 02 73 00 00 00 03 6B 65 79 73 00 00 00 05 76 61 6C 75 65"},
    // body length counts nested containers in full
    {"nested", [] { return array_of({array_of({serialize_int(7)})}); },
     "61 00 00 00 13 00 00 00 01 61 00 00 00 0A 00 00 00 01 69 04 00 00 00 07"},
};

class Encode : public testing::TestWithParam<EncodeCase> {};

TEST_P(Encode, ProducesExactBytesAndDecodesToTheSameEncoding) {
    GvalPtr v(GetParam().make());
    Bytes expected = hex(GetParam().bytes);
    EXPECT_EQ(encode(v.get()), expected);
    EXPECT_EQ(serialize_pack_calc(v.get()), expected.size());
    GvalPtr back = decode(expected);
    ASSERT_NE(back, nullptr);
    EXPECT_EQ(serialize_type(back.get()), serialize_type(v.get()));
    EXPECT_EQ(encode(back.get()), expected);
}

INSTANTIATE_TEST_SUITE_P(Values, Encode, testing::ValuesIn(kEncodeCases),
                         [](const auto &info) { return std::string(info.param.name); });

TEST(Encode, StoresTheLengthAndSerializesIntoAnExactBuffer) {
    GvalPtr v(serialize_int(-2));
    uint32_t len = 99;
    unsigned char *buf = serialize(v.get(), &len);
    ASSERT_NE(buf, nullptr);
    EXPECT_EQ(len, 6u);
    std::free(buf);
    buf = serialize(v.get(), nullptr);  // a null length pointer is allowed
    EXPECT_NE(buf, nullptr);
    std::free(buf);
}

TEST(Encode, NullValueGivesNoBuffer) {
    uint32_t len = 5;
    EXPECT_EQ(serialize(nullptr, &len), nullptr);
    EXPECT_EQ(len, 0u);
}

TEST(Encode, KeysBeyondTheSixteenBitLengthAreCut) {
    GvalPtr h(serialize_hash());
    std::string key(70000, 'k');
    serialize_hash_add(h.get(), key.c_str(), serialize_int(1));
    Bytes b = encode(h.get());
    ASSERT_EQ(b.size(), 9u + 2 + 65535 + 6);
    EXPECT_EQ(serialize_pack_calc(h.get()), b.size());
    EXPECT_EQ(b[9], 0xFF);
    EXPECT_EQ(b[10], 0xFF);
}

TEST(Decode, WorkedExampleKeepsKeyOrderAndValues) {
    GvalPtr h = decode(encode(GvalPtr(zaltest::make_device_hash()).get()));
    ASSERT_EQ(serialize_type(h.get()), SERIALIZE_HASH);
    ASSERT_EQ(serialize_hash_count(h.get()), 2);
    EXPECT_STREQ(serialize_hash_get_key(h.get(), 0), "serial");
    EXPECT_STREQ(serialize_hash_get_key(h.get(), 1), "authenticated");
    EXPECT_STREQ(serialize_get_string(serialize_hash_get(h.get(), "serial")), "ab12");
    EXPECT_EQ(serialize_get_int(serialize_hash_get(h.get(), "authenticated")), 1);
}

TEST(Decode, FloatBitsSurviveAndInputIsNotModified) {
    GvalPtr f(serialize_float(-0.1f));
    Bytes b = encode(f.get());
    Bytes copy = b;
    GvalPtr a = decode(b), c = decode(b);
    EXPECT_EQ(b, copy);
    EXPECT_EQ(serialize_get_float(a.get()), -0.1f);
    EXPECT_EQ(serialize_get_float(c.get()), -0.1f);
}

TEST(Decode, BlobsGetTheirKindAndTerminator) {
    GvalPtr s = decode(hex("73 00 00 00 00"));
    ASSERT_EQ(serialize_type(s.get()), SERIALIZE_STRING);
    EXPECT_EQ(s->len, 0u);
    EXPECT_STREQ(serialize_get_string(s.get()), "");
    GvalPtr t = decode(hex("74 00 00 00 02 41 42"));
    ASSERT_EQ(serialize_type(t.get()), SERIALIZE_STRUCT);
    EXPECT_STREQ(static_cast<const char *>(serialize_get_struct(t.get())), "AB");
    GvalPtr b = decode(hex("62 00 00 00 02 00 FF"));
    uint32_t n = 0;
    const auto *p = static_cast<const unsigned char *>(serialize_get_bytes(b.get(), &n));
    ASSERT_EQ(n, 2u);
    EXPECT_EQ(p[1], 0xFF);
}

TEST(Decode, DeepRoundTripOfMixedContainers) {
    gval *inner = serialize_hash();
    serialize_hash_add(inner, "list", array_of({serialize_int(1), serialize_bytes("x", 1)}));
    serialize_hash_add(inner, "f", serialize_float(2.5f));
    GvalPtr outer(array_of({serialize_string("head"), inner, serialize_struct("ss", 2)}));
    Bytes once = encode(outer.get());
    GvalPtr back = decode(once);
    EXPECT_EQ(encode(back.get()), once);
    gval *h = serialize_array_get(back.get(), 1);
    EXPECT_EQ(serialize_array_count(serialize_hash_get(h, "list")), 2);
}

TEST(Decode, IgnoresBytesAfterTheFirstValue) {
    GvalPtr v = decode(hex("69 04 00 00 00 05 69 04 00 00 00 06"));
    EXPECT_EQ(serialize_get_int(v.get()), 5);
}

// What a hostile or damaged payload decodes to, as its re-encoding ("" for NULL).
struct HostileCase {
    const char *name;
    const char *input;
    const char *result;
};

const HostileCase kHostileCases[] = {
    {"unknown_first_tag", "00 00 00 00 00", ""},
    {"uppercase_tag", "49 04 00 00 00 01", ""},
    {"int_truncated", "69 04 00 00 00", ""},
    {"int_tag_only", "69", ""},
    // the value is the four bytes after the size byte, whatever that byte says
    {"int_odd_size_byte", "69 00 00 00 00 2A", "69 04 00 00 00 2A"},
    {"string_length_past_input", "73 00 00 00 05 41 42", ""},
    {"string_length_near_4g", "73 FF FF FF FF 41", ""},
    {"string_length_field_truncated", "73 00 00", ""},
    {"bytes_length_2g", "62 80 00 00 00 00", ""},
    // truncated container header: an empty container
    {"array_header_truncated", "61 00 00 00", "61 00 00 00 04 00 00 00 00"},
    {"hash_header_truncated", "68 00 00", "68 00 00 00 04 00 00 00 00"},
    {"array_count_zero_with_items", "61 00 00 00 0A 00 00 00 00 69 04 00 00 00 01",
     "61 00 00 00 04 00 00 00 00"},
    // counts larger than the input: what is there is kept
    {"array_count_near_4g", "61 00 00 00 0A FF FF FF FF 69 04 00 00 00 01",
     "61 00 00 00 0A 00 00 00 01 69 04 00 00 00 01"},
    {"hash_count_near_4g", "68 00 00 00 04 FF FF FF FF 00 01 6B 69 04 00 00 00 02",
     "68 00 00 00 0D 00 00 00 01 00 01 6B 69 04 00 00 00 02"},
    // an element that cannot be decoded ends its container; earlier ones stay
    {"array_element_truncated", "61 00 00 00 0A 00 00 00 03 69 04 00 00 00 01 73 00 00 00 09 41",
     "61 00 00 00 0A 00 00 00 01 69 04 00 00 00 01"},
    {"hash_key_past_input", "68 00 00 00 04 00 00 00 02 00 01 61 69 04 00 00 00 01 00 FF 62",
     "68 00 00 00 0D 00 00 00 01 00 01 61 69 04 00 00 00 01"},
    {"hash_value_tag_missing", "68 00 00 00 04 00 00 00 01 00 01 61", "68 00 00 00 04 00 00 00 00"},
    {"hash_length_byte_only", "68 00 00 00 04 00 00 00 01 00", "68 00 00 00 04 00 00 00 00"},
    {"nested_array_truncated", "61 00 00 00 04 00 00 00 01 61 00 00 00 04 00 00 00 05 69 04",
     "61 00 00 00 0D 00 00 00 01 61 00 00 00 04 00 00 00 00"},
    // unknown tags: a struct inside arrays, a dropped entry inside hashes
    {"array_unknown_tag_is_struct", "61 00 00 00 0A 00 00 00 01 7A 00 00 00 01 41",
     "61 00 00 00 0A 00 00 00 01 74 00 00 00 01 41"},
    {"hash_unknown_value_tag_dropped",
     "68 00 00 00 04 00 00 00 02 00 01 61 7A 00 01 62 69 04 00 00 00 02",
     "68 00 00 00 0D 00 00 00 01 00 01 62 69 04 00 00 00 02"},
    // duplicate keys: first position, last value
    {"hash_duplicate_key",
     "68 00 00 00 04 00 00 00 03 00 01 62 69 04 00 00 00 01 00 01 61 69 04 00 00 00 02"
     " 00 01 62 69 04 00 00 00 03",
     "68 00 00 00 16 00 00 00 02 00 01 62 69 04 00 00 00 03 00 01 61 69 04 00 00 00 02"},
    {"hash_empty_key", "68 00 00 00 04 00 00 00 01 00 00 69 04 00 00 00 01",
     "68 00 00 00 0C 00 00 00 01 00 00 69 04 00 00 00 01"},
};

class Hostile : public testing::TestWithParam<HostileCase> {};

TEST_P(Hostile, DecodesWithinTheInput) {
    // An exact-size heap copy lets the sanitizers see any read past the input.
    Bytes in = hex(GetParam().input);
    std::unique_ptr<unsigned char[]> exact(new unsigned char[in.size()]);
    std::memcpy(exact.get(), in.data(), in.size());
    GvalPtr v(unserialize(exact.get(), static_cast<uint32_t>(in.size())));
    EXPECT_EQ(encode(v.get()), hex(GetParam().result));
}

INSTANTIATE_TEST_SUITE_P(Input, Hostile, testing::ValuesIn(kHostileCases),
                         [](const auto &info) { return std::string(info.param.name); });

TEST(Hostile, ZeroLengthAndNullBufferGiveNull) {
    unsigned char tag = 'i';
    EXPECT_EQ(unserialize(&tag, 0), nullptr);
    EXPECT_EQ(unserialize(nullptr, 10), nullptr);
}

Bytes hash_with_key(size_t key_length) {
    Bytes b = hex("68 00 00 00 00 00 00 00 01");
    b.push_back(static_cast<unsigned char>(key_length >> 8));
    b.push_back(static_cast<unsigned char>(key_length));
    for (size_t i = 0; i < key_length; ++i) b.push_back(static_cast<unsigned char>('a' + i % 26));
    Bytes value = hex("69 04 00 00 00 09");
    b.insert(b.end(), value.begin(), value.end());
    return b;
}

TEST(Hostile, LongKeysAreCutTo255Bytes) {
    for (size_t length : {255u, 256u, 1000u, 65535u}) {
        GvalPtr h = decode(hash_with_key(length));
        ASSERT_EQ(serialize_hash_count(h.get()), 1) << length;
        const char *key = serialize_hash_get_key(h.get(), 0);
        EXPECT_EQ(std::strlen(key), 255u) << length;
        // the value after the long key is still found
        EXPECT_EQ(serialize_get_int(serialize_hash_get(h.get(), key)), 9) << length;
    }
}

// n arrays nested in each other around an int.
Bytes nested_arrays(int n) {
    Bytes b;
    for (int i = 0; i < n; ++i) {
        Bytes head = hex("61 00 00 00 00 00 00 00 01");
        b.insert(b.end(), head.begin(), head.end());
    }
    Bytes leaf = hex("69 04 00 00 00 01");
    b.insert(b.end(), leaf.begin(), leaf.end());
    return b;
}

int depth_of(const gval *v) {
    int depth = 0;
    while (serialize_type(v) == SERIALIZE_ARRAY && serialize_array_count(v) > 0) {
        v = serialize_array_get(v, 0);
        ++depth;
    }
    return serialize_type(v) == SERIALIZE_ARRAY ? depth + 1 : depth;
}

TEST(Hostile, NestingIsBoundedAt256Containers) {
    GvalPtr ok = decode(nested_arrays(256));
    EXPECT_EQ(depth_of(ok.get()), 256);
    GvalPtr deep = decode(nested_arrays(100000));  // must not exhaust the stack
    ASSERT_NE(deep, nullptr);
    EXPECT_EQ(depth_of(deep.get()), 256);
}

TEST(Hostile, HugeCountsAllocateNothingInAdvance) {
    // 4 billion declared items but input for 2: the container stays small.
    GvalPtr a = decode(hex("61 00 00 00 00 FF FF FF FF 69 04 00 00 00 01 69 04 00 00 00 02"));
    ASSERT_EQ(serialize_array_count(a.get()), 2);
    EXPECT_LE(static_cast<gval_array *>(a->data)->capacity, 8);
    GvalPtr h = decode(hex("68 00 00 00 00 7F FF FF FF"));
    EXPECT_LE(static_cast<gval_hash *>(h->data)->capacity, 8);
}

TEST(Hostile, LargeHashWithRepeatedKeysStaysDeduplicated) {
    // 200 entries over 50 distinct keys: exercises the index used beyond small hashes.
    gval *src = serialize_array();
    Bytes b = hex("68 00 00 00 00 00 00 00 C8");
    for (int i = 0; i < 200; ++i) {
        std::string key = "k" + std::to_string(i % 50);
        b.push_back(0);
        b.push_back(static_cast<unsigned char>(key.size()));
        b.insert(b.end(), key.begin(), key.end());
        Bytes v = hex("69 04 00 00 00");
        v.push_back(static_cast<unsigned char>(i));
        b.insert(b.end(), v.begin(), v.end());
    }
    serialize_free(src);
    GvalPtr h = decode(b);
    ASSERT_EQ(serialize_hash_count(h.get()), 50);
    EXPECT_STREQ(serialize_hash_get_key(h.get(), 7), "k7");
    EXPECT_EQ(serialize_get_int(serialize_hash_get(h.get(), "k7")), 157);
}

TEST(Readers, ReportTheBytesUsedAfterTheTag) {
    Bytes s = hex("00 00 00 03 61 62 63");
    uint32_t used = 10;
    GvalPtr v(serialize_string_unpack(s.data(), static_cast<uint32_t>(s.size()), &used, 6));
    EXPECT_EQ(used, 17u);  // adds to the running count
    EXPECT_EQ(serialize_type(v.get()), SERIALIZE_STRUCT);
    Bytes i = hex("04 00 00 00 2A");
    used = 0;
    GvalPtr n(serialize_int_unpack(i.data(), 5, &used));
    EXPECT_EQ(used, 5u);
    EXPECT_EQ(serialize_get_int(n.get()), 42);
    EXPECT_EQ(serialize_int_unpack(i.data(), 4, &used), nullptr);
}

TEST(SizeCalc, AgreesWithTheWriters) {
    GvalPtr h(zaltest::make_device_hash());
    EXPECT_EQ(serialize_hash_pack_calc(h.get()), 47u);
    EXPECT_EQ(serialize_int_pack_calc(), 6u);
    EXPECT_EQ(serialize_float_pack_calc(), 6u);
    GvalPtr s(serialize_string("abc"));
    EXPECT_EQ(serialize_string_pack_calc(s.get()), 8u);
    std::vector<unsigned char> out(8);
    EXPECT_EQ(serialize_string_pack(out.data(), s.get(), SERIALIZE_BYTES), 8u);
    EXPECT_EQ(out[0], 'b');
}

}  // namespace

// The value tree: constructors, container growth and ownership, hash key order, copies.
#include <gtest/gtest.h>
#include <android/log.h>

#include <cstring>

#include "log_capture.h"
#include "value_builders.h"

using zaltest::GvalPtr;

namespace {

TEST(Value, ScalarsAndBlobsHoldTheirPayload) {
    struct Case {
        gval *v;
        int kind;
        uint32_t len;
    };
    Case cases[] = {
        {serialize_int(-7), SERIALIZE_INT, 4},
        {serialize_float(0.25f), SERIALIZE_FLOAT, 4},
        {serialize_string("hello"), SERIALIZE_STRING, 5},
        {serialize_string(""), SERIALIZE_STRING, 0},
        {serialize_bytes("\0\1", 2), SERIALIZE_BYTES, 2},
        {serialize_bytes("x", 0), SERIALIZE_BYTES, 0},
        {serialize_struct("ab", 2), SERIALIZE_STRUCT, 2},
        {serialize_struct("ab", 0), SERIALIZE_STRUCT, 0},
    };
    for (const Case &c : cases) {
        GvalPtr v(c.v);
        ASSERT_NE(v, nullptr);
        EXPECT_EQ(serialize_type(v.get()), c.kind);
        EXPECT_EQ(v->len, c.len);
    }
    GvalPtr i(serialize_int(-7)), f(serialize_float(0.25f)), s(serialize_struct("ab", 0));
    EXPECT_EQ(serialize_get_int(i.get()), -7);
    EXPECT_EQ(serialize_get_float(f.get()), 0.25f);
    EXPECT_STREQ(static_cast<const char *>(serialize_get_struct(s.get())), "");
    EXPECT_EQ(serialize_get_struct_length(s.get()), 0u);
}

TEST(Value, NullValueHasKindSevenAndIsLogged) {
    zaltest::LogCapture log;
    EXPECT_EQ(serialize_type(nullptr), SERIALIZE_NONE);
    serialize_free(nullptr);
    auto debug = log.texts(ANDROID_LOG_DEBUG);
    ASSERT_EQ(debug.size(), 2u);
    EXPECT_EQ(debug[0], "serialize_type: gval is NULL!");
}

TEST(Array, GrowsByDoublingAndKeepsIndexes) {
    GvalPtr a(serialize_array());
    auto *body = static_cast<gval_array *>(a->data);
    EXPECT_EQ(body->capacity, 8);
    for (int i = 0; i < 9; ++i) ASSERT_EQ(serialize_array_add(a.get(), serialize_int(i)), 0);
    EXPECT_EQ(body->capacity, 16);
    for (int i = 0; i < 9; ++i)
        EXPECT_EQ(serialize_get_int(serialize_array_get(a.get(), static_cast<uint32_t>(i))), i);
}

TEST(Array, ZeroCapacityGrowsOnFirstAdd) {
    GvalPtr a(serialize_array_reserve(0));
    for (int i = 0; i < 3; ++i) ASSERT_EQ(serialize_array_add(a.get(), serialize_int(i)), 0);
    EXPECT_EQ(serialize_array_count(a.get()), 3);
}

TEST(Array, OutOfRangeOperationsChangeNothing) {
    GvalPtr a(serialize_array());
    EXPECT_EQ(serialize_array_get(a.get(), 0), nullptr);
    gval *item = serialize_int(1);
    serialize_array_set(a.get(), 0, item);
    serialize_array_insert(a.get(), 0, item);
    serialize_array_del(a.get(), 0);
    EXPECT_EQ(serialize_array_count(a.get()), 0);
    serialize_free(item);  // still the caller's
    EXPECT_EQ(serialize_array_add(a.get(), nullptr), -1);
}

TEST(Array, InsertSetAndDeleteShiftItems) {
    GvalPtr a(serialize_array());
    serialize_array_add(a.get(), serialize_int(1));
    serialize_array_add(a.get(), serialize_int(2));
    gval *at_end = serialize_int(99);
    serialize_array_insert(a.get(), 2, at_end);  // at count: nothing happens
    serialize_free(at_end);
    serialize_array_insert(a.get(), 0, serialize_int(0));
    serialize_array_set(a.get(), 2, serialize_int(20));
    ASSERT_EQ(serialize_array_count(a.get()), 3);
    EXPECT_EQ(serialize_get_int(serialize_array_get(a.get(), 0)), 0);
    EXPECT_EQ(serialize_get_int(serialize_array_get(a.get(), 2)), 20);
    serialize_array_del(a.get(), 0);
    EXPECT_EQ(serialize_get_int(serialize_array_get(a.get(), 0)), 1);
    EXPECT_EQ(serialize_array_count(a.get()), 2);
}

TEST(Array, AddToSomethingElseFreesTheItem) {
    GvalPtr h(serialize_hash());
    EXPECT_EQ(serialize_array_add(h.get(), serialize_string("leak?")), -1);  // ASan checks
}

TEST(Hash, ReplacingKeepsPositionAndFreesTheOldValue) {
    GvalPtr h(serialize_hash());
    serialize_hash_add(h.get(), "b", serialize_int(1));
    serialize_hash_add(h.get(), "a", serialize_int(2));
    serialize_hash_add(h.get(), "b", serialize_int(3));
    ASSERT_EQ(serialize_hash_count(h.get()), 2);
    EXPECT_STREQ(serialize_hash_get_key(h.get(), 0), "b");
    EXPECT_STREQ(serialize_hash_get_key(h.get(), 1), "a");
    EXPECT_EQ(serialize_get_int(serialize_hash_get(h.get(), "b")), 3);
    EXPECT_EQ(serialize_hash_get_key(h.get(), -1), nullptr);
    EXPECT_EQ(serialize_hash_get_key(h.get(), 2), nullptr);
    EXPECT_EQ(serialize_hash_get(h.get(), "c"), nullptr);
}

TEST(Hash, KeysAreCopiedAndNullKeyLeavesValueWithCaller) {
    GvalPtr h(serialize_hash());
    char key[] = "name";
    serialize_hash_add(h.get(), key, serialize_int(1));
    key[0] = 'g';
    EXPECT_STREQ(serialize_hash_get_key(h.get(), 0), "name");
    gval *v = serialize_int(2);
    EXPECT_EQ(serialize_hash_add(h.get(), nullptr, v), -1);
    serialize_free(v);
    for (int i = 0; i < 20; ++i)
        serialize_hash_add(h.get(), std::to_string(i).c_str(), serialize_int(i));
    EXPECT_EQ(serialize_hash_count(h.get()), 21);
    EXPECT_EQ(serialize_get_int(serialize_hash_get(h.get(), "19")), 19);
}

TEST(Hash, DecodedHashesStayEditable) {
    // Decoded entries keep their keys beside their values; replacing a value of any kind
    // must leave the entry's key readable and in place.
    GvalPtr h(serialize_hash());
    serialize_hash_add(h.get(), "n", serialize_int(1));
    serialize_hash_add(h.get(), "s", serialize_string("text"));
    serialize_hash_add(h.get(), "list", serialize_array());
    serialize_hash_add(h.get(), "map", serialize_hash());
    GvalPtr copy(serialize_dup(h.get()));
    ASSERT_NE(copy, nullptr);
    const char *keys[] = {"n", "s", "list", "map"};
    // Key pointers read before the replacements stay valid as long as the hash.
    const char *held[4];
    for (int i = 0; i < 4; ++i) held[i] = serialize_hash_get_key(copy.get(), i);
    for (int round = 0; round < 2; ++round) {
        for (int i = 0; i < 4; ++i) {
            ASSERT_EQ(serialize_hash_add(copy.get(), held[i], serialize_int(9)), 0) << keys[i];
            EXPECT_EQ(serialize_get_int(serialize_hash_get(copy.get(), keys[i])), 9) << keys[i];
        }
    }
    for (int i = 0; i < 4; ++i) EXPECT_STREQ(held[i], keys[i]);
    serialize_hash_add(copy.get(), "added", serialize_int(10));
    GvalPtr expected(serialize_hash());
    for (const char *key : keys) serialize_hash_add(expected.get(), key, serialize_int(9));
    serialize_hash_add(expected.get(), "added", serialize_int(10));
    EXPECT_EQ(zaltest::encode(copy.get()), zaltest::encode(expected.get()));
}

TEST(Value, NestedTreeIsFreedOnceAndDupSharesNothing) {
    GvalPtr h(serialize_hash());
    gval *list = serialize_array();
    for (int i = 0; i < 3; ++i) {
        gval *inner = serialize_hash();
        serialize_hash_add(inner, "n", serialize_int(i));
        serialize_array_add(list, inner);
    }
    serialize_hash_add(h.get(), "list", list);
    serialize_hash_add(h.get(), "name", serialize_string("x"));
    GvalPtr copy(serialize_dup(h.get()));
    ASSERT_NE(copy, nullptr);
    EXPECT_EQ(zaltest::encode(copy.get()), zaltest::encode(h.get()));
    EXPECT_NE(serialize_hash_get(copy.get(), "list"), list);
    EXPECT_NE(serialize_hash_get_key(copy.get(), 0), serialize_hash_get_key(h.get(), 0));
}

TEST(Value, AccessorsTolerateWrongKindsAndNull) {
    GvalPtr i(serialize_int(1));
    EXPECT_EQ(serialize_array_count(i.get()), 0);
    EXPECT_EQ(serialize_hash_count(nullptr), 0);
    EXPECT_EQ(serialize_array_get(nullptr, 0), nullptr);
    EXPECT_EQ(serialize_hash_get(i.get(), "k"), nullptr);
}

}  // namespace

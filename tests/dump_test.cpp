// Diagnostic dumps of values into the log and on standard output, and hex dumps.
#include <gtest/gtest.h>
#include <android/log.h>

#include <string>
#include <vector>

#include "log_capture.h"
#include "value_builders.h"

using testing::internal::CaptureStdout;
using testing::internal::GetCapturedStdout;
using zaltest::GvalPtr;

namespace {

std::string stdout_of_depth2(const gval *v, int depth) {
    CaptureStdout();
    serialize_print_depth2(v, depth);
    return GetCapturedStdout();
}

TEST(PrintDepth2, WorkedExampleHash) {
    GvalPtr h(zaltest::make_device_hash());
    EXPECT_EQ(stdout_of_depth2(h.get(), 0),
              "{\n  \"serial\"=>  ab12\n  \"authenticated\"=>  1\n}\n");
}

TEST(PrintDepth2, Shapes) {
    struct Case {
        const char *name;
        gval *v;
        int depth;
        const char *out;
    } cases[] = {
        {"bytes_escaped", serialize_bytes("A \n", 3), 0, "A\\x20\\x0a\n"},
        {"bytes_high", serialize_bytes("\x7e\x7f\xff", 3), 0, "~\\x7f\\xff\n"},
        {"bytes_empty", serialize_bytes("", 0), 1, "  \n"},
        {"float", serialize_float(1.5f), 0, "1.500000\n"},
        {"int_indented", serialize_int(-3), 2, "    -3\n"},
        {"struct", serialize_struct("x", 1), 0, "unknown type\n"},
        {"null", nullptr, 1, "  unknown type\n"},
        {"array_no_brackets", nullptr, 0, "  1\n  two\n"},
        {"empty_hash", serialize_hash(), 1, "  {\n  }\n"},
    };
    for (Case &c : cases) {
        if (std::string(c.name) == "array_no_brackets") {
            c.v = serialize_array();
            serialize_array_add(c.v, serialize_int(1));
            serialize_array_add(c.v, serialize_string("two"));
        }
        GvalPtr v(c.v);
        EXPECT_EQ(stdout_of_depth2(v.get(), c.depth), c.out) << c.name;
    }
}

TEST(PrintHex, HeaderBytesAndNewline) {
    const unsigned char bytes[] = {0x00, 0xAB};
    CaptureStdout();
    print_hex(bytes, 2);
    EXPECT_EQ(GetCapturedStdout(), "\nprint_hex, count=2\n00AB\n");
    CaptureStdout();
    print_hex(nullptr, 0);
    print_hex(bytes, -4);
    EXPECT_EQ(GetCapturedStdout(), "\nprint_hex, count=0\n\n\nprint_hex, count=-4\n\n");
}

std::vector<std::string> logged(const gval *v) {
    zaltest::LogCapture log;
    serialize_print(v);
    for (const auto &r : log.records()) EXPECT_EQ(r.tag, "carplay-zald-2");
    return log.texts(ANDROID_LOG_DEBUG);
}

TEST(Print, OneRecordPerPiece) {
    GvalPtr h(zaltest::make_device_hash());
    gval *list = serialize_array();
    serialize_array_add(list, serialize_bytes("abc", 3));
    serialize_array_add(list, serialize_float(0.5f));
    serialize_hash_add(h.get(), "list", list);
    std::vector<std::string> expected = {
        "{\n", "  ", "\"serial\"=>", "  ", "ab12\n", "  ", "\"authenticated\"=>", "  ", "1\n", "  ",
        "\"list\"=>",
        // the array adds a level for its items but writes nothing itself
        "  ", "  ", "binary data lenght: 3\n", "\n", "  ", "  ", "0.500000\n", "}\n"};
    EXPECT_EQ(logged(h.get()), expected);
}

TEST(Print, StructAndNullAreUnknown) {
    GvalPtr s(serialize_struct("x", 1));
    EXPECT_EQ(logged(s.get()), std::vector<std::string>{"unknown type\n"});
    std::vector<std::string> null_dump = {"serialize_type: gval is NULL!", "unknown type\n"};
    EXPECT_EQ(logged(nullptr), null_dump);
}

TEST(Print, DepthIndentsEveryLine) {
    GvalPtr i(serialize_int(4));
    zaltest::LogCapture log;
    serialize_print_depth(i.get(), 2);
    EXPECT_EQ(log.texts(ANDROID_LOG_DEBUG), (std::vector<std::string>{"  ", "  ", "4\n"}));
}

}  // namespace

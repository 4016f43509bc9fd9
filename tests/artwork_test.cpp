// Artwork: the shared-file mapping (made, kept, replaced, refused), inline pixels, the
// length accessor, the reset, the raised reply time-out and the artwork times.
#include <fcntl.h>
#include <sys/mman.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include <atomic>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "client_helpers.h"
#include "fake_daemon.h"
#include "zal-ipod-2/artwork_state.h"
#include "zal-ipod-2/packet.h"

using namespace zaltest;

namespace {

// A file of `size` bytes, byte i holding i * 7 (mod 256); removed with the object.
class PixelFile {
  public:
    explicit PixelFile(size_t size) {
        char name[] = "/tmp/zal-artwork-XXXXXX";
        int fd = mkstemp(name);
        path_ = name;
        std::vector<unsigned char> bytes(size);
        for (size_t i = 0; i < size; ++i) bytes[i] = static_cast<unsigned char>(i * 7);
        EXPECT_EQ(write(fd, bytes.data(), size), static_cast<ssize_t>(size));
        close(fd);
    }
    ~PixelFile() { unlink(path_.c_str()); }
    const char *path() const { return path_.c_str(); }
    // Writes one byte the way the daemon rewrites the picture.
    void poke(off_t at, unsigned char value) const {
        int fd = open(path_.c_str(), O_WRONLY);
        EXPECT_EQ(pwrite(fd, &value, 1, at), 1);
        close(fd);
    }

  private:
    std::string path_;
};

gval *shared_reply(int width, int height, int stride, const char *path) {
    return hash_of({{"width", serialize_int(width)},
                    {"height", serialize_int(height)},
                    {"rowstride", serialize_int(stride)},
                    {"image_path", serialize_string(path)}});
}

gval *inline_reply(int width, int height, int stride, const std::vector<unsigned char> &pixels,
                   int format = -1, int data_length = -1) {
    gval *h =
        hash_of({{"width", serialize_int(width)},
                 {"height", serialize_int(height)},
                 {"rowstride", serialize_int(stride)},
                 {"image", serialize_bytes(pixels.data(), static_cast<uint32_t>(pixels.size()))}});
    if (format >= 0) serialize_hash_add(h, "pixel_format", serialize_int(format));
    if (data_length >= 0) serialize_hash_add(h, "data_length", serialize_int(data_length));
    return h;
}

int32_t decode(zal_ipod_handle *h, gval *value) {
    zal_ipod_reply *r = make_reply(1, ZAL_OP_RETURN, value);
    int32_t result = zal_artwork_decode(h, r);
    reply_record_free(r);
    return result;
}

// Reads every byte the length accessor promises (ASan flags a read past the buffer).
unsigned sum_of_reported_bytes(zal_ipod_handle *h) {
    const unsigned char *p = zal_ipod_current_track_artwork_data(h);
    unsigned sum = 0;
    for (uint32_t i = 0; p != nullptr && i < zal_ipod_current_track_artwork_length(h); ++i)
        sum += p[i];
    return sum;
}

void expect_empty(zal_ipod_handle *h) {
    EXPECT_EQ(zal_ipod_current_track_artwork_data(h), nullptr);
    EXPECT_EQ(h->artwork.mapping, nullptr);
    EXPECT_EQ(h->artwork.mapping_length, 0);
    EXPECT_EQ(zal_ipod_current_track_artwork_width(h), 0);
    EXPECT_EQ(zal_ipod_current_track_artwork_height(h), 0);
    EXPECT_EQ(zal_ipod_current_track_artwork_length(h), 0u);
}

// One step of a sequence of shared-file replies on one handle.
struct MappingStep {
    const char *name;
    int height;      // row stride 400 throughout
    bool real_path;  // false: a path that does not exist
    int32_t result;
    int32_t mapped;     // mapping length afterwards (0: none)
    bool same_mapping;  // the mapping of the previous step was kept
};

TEST(ArtworkMapping, GrowKeepShrinkAndRefuse) {
    PixelFile file(80000);
    const MappingStep steps[] = {
        {"first", 100, true, 1, 40000, false},
        {"smaller_keeps_without_opening", 50, false, 1, 40000, true},
        {"same_size_keeps", 100, true, 1, 40000, true},
        {"larger_maps_again", 200, true, 1, 80000, false},
        {"shrink_keeps", 10, true, 1, 80000, true},
        {"file_too_short_refused", 300, true, -1, 0, false},
        {"after_refusal_maps_again", 100, true, 1, 40000, false},
        {"missing_file_refused", 250, false, -1, 0, false},
        {"empty_geometry_refused", 0, true, -1, 0, false},
    };
    zal_ipod_handle *h = offline_handle();
    void *previous = nullptr;
    for (const MappingStep &s : steps) {
        SCOPED_TRACE(s.name);
        EXPECT_EQ(decode(h, shared_reply(200, s.height, 400,
                                         s.real_path ? file.path() : "/nonexistent/artwork")),
                  s.result);
        EXPECT_EQ(h->artwork.mapping_length, s.mapped);
        if (s.result < 0) {
            expect_empty(h);
        } else {
            ASSERT_NE(h->artwork.mapping, nullptr);
            EXPECT_EQ(zal_ipod_current_track_artwork_data(h), h->artwork.mapping);
            EXPECT_EQ(zal_ipod_current_track_artwork_height(h), s.height);
            EXPECT_EQ(zal_ipod_current_track_artwork_rowstride(h), 400);
            EXPECT_EQ(zal_ipod_current_track_artwork_length(h), uint32_t(s.height) * 400);
            if (s.same_mapping) {
                EXPECT_EQ(h->artwork.mapping, previous);
            }
            const unsigned char *p = zal_ipod_current_track_artwork_data(h);
            EXPECT_EQ(p[1], 7);
            EXPECT_EQ(p[s.height * 400 - 1], static_cast<unsigned char>((s.height * 400 - 1) * 7));
        }
        previous = h->artwork.mapping;
    }
    zal_ipod_close(h);
}

TEST(ArtworkMapping, PixelsAreReadInTheSharedFileNotCopied) {
    PixelFile file(4000);
    zal_ipod_handle *h = offline_handle();
    ASSERT_EQ(decode(h, shared_reply(10, 10, 40, file.path())), 1);
    file.poke(123, 0xAB);
    EXPECT_EQ(zal_ipod_current_track_artwork_data(h)[123], 0xAB);
    zal_ipod_close(h);
}

TEST(ArtworkMapping, InlinePictureBetweenSharedOnesKeepsTheMapping) {
    PixelFile file(4000);
    zal_ipod_handle *h = offline_handle();
    ASSERT_EQ(decode(h, shared_reply(10, 10, 40, file.path())), 1);
    void *mapping = h->artwork.mapping;
    ASSERT_EQ(decode(h, inline_reply(2, 2, 4, {9, 9, 9, 9, 9, 9, 9, 9}, 2)), 1);
    EXPECT_EQ(h->artwork.mapping, mapping);
    EXPECT_NE(zal_ipod_current_track_artwork_data(h), mapping);
    EXPECT_EQ(zal_ipod_current_track_artwork_data(h)[0], 9);
    // The next shared-file picture fits the mapping: the data is the file's again.
    ASSERT_EQ(decode(h, shared_reply(10, 5, 40, file.path())), 1);
    EXPECT_EQ(h->artwork.mapping, mapping);
    EXPECT_EQ(zal_ipod_current_track_artwork_data(h), mapping);
    EXPECT_EQ(zal_ipod_current_track_artwork_length(h), 200u);
    zal_ipod_close(h);
}

// ---- Inline pixels ---------------------------------------------------------------------

struct InlineCase {
    const char *name;
    int width, height, stride;
    size_t bytes;
    int format;       // -1: no "pixel_format" key
    int data_length;  // -1: no "data_length" key
    uint32_t length;  // the length accessor afterwards
    uint8_t pixel_format;
    uint32_t data_length_field;
};

void PrintTo(const InlineCase &c, std::ostream *os) {
    *os << c.name;
}

class ArtworkInline : public ::testing::TestWithParam<InlineCase> {};

TEST_P(ArtworkInline, StoresOneCopy) {
    const InlineCase &c = GetParam();
    zal_ipod_handle *h = offline_handle();
    // A previous picture with format 7 and data length 77 shows what a reply keeps.
    h->artwork.pixel_format = 7;
    h->artwork.data_length = 77;
    std::vector<unsigned char> pixels(c.bytes);
    for (size_t i = 0; i < pixels.size(); ++i) pixels[i] = static_cast<unsigned char>(i + 1);
    ASSERT_EQ(decode(h, inline_reply(c.width, c.height, c.stride, pixels, c.format, c.data_length)),
              1);
    EXPECT_EQ(zal_ipod_current_track_artwork_length(h), c.length);
    EXPECT_EQ(zal_ipod_current_track_artwork_pixel_format(h), c.pixel_format);
    EXPECT_EQ(h->artwork.data_length, c.data_length_field);
    EXPECT_EQ(h->artwork.mapping, nullptr);
    const unsigned char *p = zal_ipod_current_track_artwork_data(h);
    if (c.bytes > 0) {
        ASSERT_NE(p, nullptr);
        EXPECT_EQ(memcmp(p, pixels.data(), pixels.size()), 0);
    }
    // Every reported byte is readable; bytes the reply did not carry read as 0.
    unsigned expected = 0;
    for (unsigned char b : pixels) expected += b;
    EXPECT_EQ(sum_of_reported_bytes(h), expected);
    zal_ipod_close(h);
}

INSTANTIATE_TEST_SUITE_P(
    Replies, ArtworkInline,
    ::testing::Values(
        InlineCase{"rgb565", 2, 3, 4, 12, 2, -1, 12, 2, 12},
        InlineCase{"explicit_length_without_geometry", 0, 0, 0, 1234, 255, 1234, 1234, 255, 1234},
        InlineCase{"explicit_length_with_geometry", 10, 4, 20, 30, 255, 30, 80, 255, 30},
        InlineCase{"format_absent_keeps_previous", 2, 2, 4, 8, -1, -1, 8, 7, 77},
        InlineCase{"explicit_length_beyond_the_bytes", 0, 0, 0, 10, 255, 5000, 10, 255, 5000},
        InlineCase{"fewer_bytes_than_the_geometry", 4, 4, 8, 6, 2, -1, 32, 2, 32},
        InlineCase{"no_bytes", 0, 0, 0, 0, 2, -1, 0, 2, 0}),
    [](const auto &info) { return std::string(info.param.name); });

TEST(ArtworkReplies, FailuresKeepThePreviousPicture) {
    zal_ipod_handle *h = offline_handle();
    ASSERT_EQ(decode(h, inline_reply(2, 1, 4, {1, 2, 3, 4}, 2)), 1);
    const unsigned char *before = zal_ipod_current_track_artwork_data(h);
    struct {
        const char *name;
        gval *reply;
    } failures[] = {
        {"error", hash_of({{"error", serialize_string("no artwork")}})},
        {"neither_file_nor_pixels", hash_of({{"width", serialize_int(9)}})},
        {"pixels_not_bytes", hash_of({{"width", serialize_int(9)}, {"image", serialize_int(1)}})},
        {"not_a_hash", serialize_int(1)},
        {"no_payload", nullptr},
    };
    for (auto &f : failures) {
        SCOPED_TRACE(f.name);
        EXPECT_EQ(decode(h, f.reply), -1);
        EXPECT_EQ(zal_ipod_current_track_artwork_data(h), before);
        EXPECT_EQ(zal_ipod_current_track_artwork_width(h), 2);
        EXPECT_EQ(zal_ipod_current_track_artwork_length(h), 4u);
    }
    EXPECT_STREQ(zal_ipod_get_error_message(h), "no artwork");
    zal_ipod_close(h);
}

TEST(ArtworkReplies, ReplyCallbackFillsTheSameRecord) {
    zal_ipod_handle *h = offline_handle();
    std::vector<int32_t> results;
    zal_ipod_set_reply_cb(
        h,
        [](zal_ipod_handle *, uint16_t, int32_t result, const char *, void *user) {
            static_cast<std::vector<int32_t> *>(user)->push_back(result);
            return 0;
        },
        &results);
    h->slots.artwork_tid = 11;
    h->slots.artwork_by_uid_tid = 12;
    queue_record(h, make_reply(11, ZAL_OP_RETURN, inline_reply(1, 1, 2, {5, 6}, 2)));
    zal_ipod_pending_event(h);
    EXPECT_EQ(zal_ipod_current_track_artwork_data(h)[1], 6);
    queue_record(h, make_reply(12, ZAL_OP_RETURN, inline_reply(1, 2, 2, {7, 8, 9, 10}, 2)));
    zal_ipod_pending_event(h);
    EXPECT_EQ(zal_ipod_current_track_artwork_length(h), 4u);
    EXPECT_EQ(zal_ipod_current_track_artwork_data(h)[3], 10);
    EXPECT_EQ(results, (std::vector<int32_t>{1, 1}));
    zal_ipod_close(h);
}

TEST(ArtworkReset, SessionOpenEmptiesTheRecord) {
    PixelFile file(4000);
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d);
    ASSERT_NE(h, nullptr);
    ASSERT_EQ(decode(h, shared_reply(10, 10, 40, file.path())), 1);
    ASSERT_EQ(decode(h, inline_reply(2, 1, 4, {1, 2, 3, 4}, 255, 4)), 1);
    d.expect(ZAL_OP_OPEN_SESSION, serialize_int(0))
        .reply(hash_of(
            {{"result", serialize_int(1)}, {"devices", device_list({device_entry("P", 1, 1)})}}));
    EXPECT_EQ(zal_ipod_open_session_sync(h, 0), 1);
    EXPECT_TRUE(d.finish()) << d.report();
    expect_empty(h);
    EXPECT_EQ(zal_ipod_current_track_artwork_pixel_format(h), 0);
    EXPECT_EQ(h->artwork.data_length, 0u);
    zal_ipod_close(h);
}

// ---- The _sync forms -------------------------------------------------------------------

TEST(ArtworkSync, WaitsAtLeastTwentySecondsThenRestoresTheTimeOut) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d);
    ASSERT_NE(h, nullptr);
    std::atomic<uint32_t> during{0};
    auto answer = [&](gval *reply) {
        return [&during, h, reply](uint16_t tid) {
            during = h->read_timeout_sec.load();
            Bytes b = frame(tid, ZAL_OP_RETURN, reply);
            serialize_free(reply);
            return b;
        };
    };
    const struct {
        unsigned own;
        uint32_t expected_during;
    } cases[] = {{5, 20}, {30, 30}, {19, 20}};
    for (const auto &c : cases) {
        SCOPED_TRACE(c.own);
        zal_ipod_set_read_timeout(h, c.own, 0);
        d.expect(ZAL_OP_CURRENT_TRACK_ARTWORK, serialize_int(0))
            .send(answer(inline_reply(1, 1, 2, {1, 2}, 2)));
        EXPECT_EQ(zal_ipod_current_track_artwork_sync(h, 0), 1);
        EXPECT_TRUE(d.finish()) << d.report();
        EXPECT_EQ(during.load(), c.expected_during);
        EXPECT_EQ(h->read_timeout_sec.load(), c.own);
    }
    // A failed reply and a refused request restore it too.
    zal_ipod_set_read_timeout(h, 5, 0);
    gval *position = serialize_array();
    serialize_array_add(position, serialize_int(0));
    serialize_array_add(position, serialize_int(1000));
    d.expect(ZAL_OP_CURRENT_TRACK_POS_ARTWORK, position)
        .error(hash_of({{"error", serialize_string("x")}}));
    EXPECT_EQ(zal_ipod_current_track_pos_artwork_sync(h, 0, 1000), -1);
    EXPECT_TRUE(d.finish()) << d.report();
    EXPECT_EQ(h->read_timeout_sec.load(), 5u);
    h->ready = 0;
    EXPECT_EQ(zal_ipod_track_artwork_by_uid_sync(h, 42), -1);
    EXPECT_EQ(h->read_timeout_sec.load(), 5u);
    zal_ipod_close(h);
}

struct TimesCase {
    const char *name;
    std::function<gval *()> reply;  // nullptr: no payload
    int result;
    int32_t count;               // expected count (kUntouched: not written)
    std::vector<int32_t> times;  // expected times when result is 1
};
constexpr int32_t kUntouched = 12345;

TEST(ArtworkTimes, ListWithoutItsFirstItem) {
    gval *(*ints)(std::initializer_list<int32_t>) = [](std::initializer_list<int32_t> items) {
        gval *a = serialize_array();
        for (int32_t v : items) serialize_array_add(a, serialize_int(v));
        return a;
    };
    const TimesCase cases[] = {
        {"three_times",
         [&] {
             return ints({7, 100, 200, 300});
         },
         1,
         3,
         {100, 200, 300}},
        {"one_item", [&] { return ints({7}); }, -1, 0, {}},
        {"empty", [&] { return ints({}); }, -1, -1, {}},
        {"not_integers",
         [] {
             gval *a = serialize_array();
             serialize_array_add(a, serialize_int(7));
             serialize_array_add(a, serialize_string("100"));
             return a;
         },
         -1,
         kUntouched,
         {}},
        {"not_an_array", [] { return serialize_int(3); }, -1, kUntouched, {}},
        {"error",
         [] {
             return hash_of({{"error", serialize_string("none")}});
         },
         -1,
         kUntouched,
         {}},
        {"no_payload", nullptr, -1, kUntouched, {}},
    };
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d);
    ASSERT_NE(h, nullptr);
    for (const TimesCase &c : cases) {
        SCOPED_TRACE(c.name);
        d.expect(ZAL_OP_CURRENT_TRACK_ARTWORK_TIMES, serialize_int(1))
            .reply(c.reply ? c.reply() : nullptr);
        int32_t sentinel = 0;
        int32_t *times = &sentinel;
        int32_t count = kUntouched;
        EXPECT_EQ(zal_ipod_current_track_artwork_times_sync(h, 1, &times, &count), c.result);
        EXPECT_TRUE(d.finish()) << d.report();
        EXPECT_EQ(count, c.count);
        if (c.result == 1) {
            ASSERT_NE(times, &sentinel);
            EXPECT_EQ(std::vector<int32_t>(times, times + count), c.times);
            free(times);
        } else {
            EXPECT_EQ(times, &sentinel);
        }
    }
    EXPECT_STREQ(zal_ipod_get_error_message(h), "none");
    zal_ipod_close(h);
}

}  // namespace

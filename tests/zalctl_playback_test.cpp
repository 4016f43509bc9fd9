// zalctl's now-playing commands against zald-sim: the status block, shuffle and repeat,
// seek, track, preferences, and artwork written as PNG files that decode to the picture.
#include <gtest/gtest.h>
#ifdef ZAL_TEST_HAVE_PNG
#include <png.h>
#endif
#include <unistd.h>

#include <string>
#include <vector>

#include "sim_fixture.h"
#include "zalctl_fixture.h"

namespace zaltest {
namespace {

// A red album on a phone that shares its pictures through a file, and the same album on one
// that sends them inline, most significant byte first.
const char *kArtworkScenario = R"json({
  "devices": [
    {"serial": "FILEPHONE001", "artwork": {"delivery": "file", "width": 40, "height": 30},
     "tracks": [{"title": "Red One", "album": "Red", "album_color": "#ff0000", "uid": 4660}]},
    {"serial": "INLINEPHONE2",
     "artwork": {"delivery": "inline", "width": 20, "height": 10, "pixel_format": 3},
     "tracks": [{"title": "Blue One", "album": "Blue", "album_color": "#0000ff", "uid": 22136}]}
  ]
})json";

class ZalctlPlayback : public ZalctlSuite {
  protected:
    void TearDown() override {
        if (!png_path.empty()) unlink(png_path.c_str());
        ZalctlSuite::TearDown();
    }
    // Runs zalctl and expects exit 0 with every text in standard output.
    void expect_output(const std::vector<std::string> &args,
                       const std::vector<std::string> &texts) {
        const ProgramResult r = zalctl(args);
        ASSERT_EQ(r.status, 0) << r.out << r.err;
        EXPECT_EQ(r.err, "");
        for (const std::string &text : texts)
            EXPECT_NE(r.out.find(text), std::string::npos) << text << " in\n" << r.out;
    }
    std::string png_path = "/tmp/" + SimProcess::unique_name("zalctl-art") + ".png";
};

struct Picture {
    unsigned width = 0, height = 0;
    std::vector<unsigned char> rgb;
};

// Reads a PNG file into 8-bit RGB; width 0 when it does not decode.
Picture read_png(const std::string &path) {
    Picture p;
#ifndef ZAL_TEST_HAVE_PNG
    (void)path;
    return p;
#else
    png_image image = {};
    image.version = PNG_IMAGE_VERSION;
    if (!png_image_begin_read_from_file(&image, path.c_str())) return p;
    image.format = PNG_FORMAT_RGB;
    p.rgb.resize(PNG_IMAGE_SIZE(image));
    if (!png_image_finish_read(&image, nullptr, p.rgb.data(), 0, nullptr)) {
        png_image_free(&image);
        return p;
    }
    p.width = image.width;
    p.height = image.height;
    return p;
#endif
}

TEST_F(ZalctlPlayback, StatusShowsTheWholeNowPlayingBlock) {
    start_sim();
    expect_output({"status"}, {"title:    Morning Drive\n", "artist:   The Simulators\n",
                               "album:    Test Patterns\n", "chapter:  -\n", "0:42 / 3:35  (1/4)",
                               "state:    paused\n", "shuffle:  off\n", "repeat:   off\n"});
}

TEST_F(ZalctlPlayback, SettersChangeTheSharedPlayer) {
    start_sim();
    expect_output({"shuffle", "albums"}, {"shuffle: albums"});
    expect_output({"repeat", "1"}, {"repeat: one"});
    expect_output({"seek", "1:30"}, {"1:30 / 3:35"});
    expect_output({"track", "3"}, {"Null Route", "(3/4)"});
    expect_output({"prefs", "set", "8", "3"}, {"preference class 8: 3"});
    // Each run is a connection of its own: the player kept what the others set.
    expect_output({"status"}, {"title:    Null Route", "shuffle:  albums", "repeat:   one"});
    expect_output({"shuffle"}, {"shuffle: albums"});
    expect_output({"prefs", "get", "8"}, {"preference class 8: 3"});
}

TEST_F(ZalctlPlayback, RefusalsAreOneLineFailures) {
    start_sim();
    const struct {
        std::vector<std::string> args;
        int status;
        const char *err;
    } cases[] = {
        {{"shuffle", "sideways"}, 2, "sideways"},
        {{"seek", "soon"}, 2, "soon"},
        {{"track", "0"}, 2, "N"},
        {{"artwork"}, 2, "--out"},
        {{"artwork", "--uid", "-3", "--out", "x.png"}, 2, ""},
        {{"seek", "9:00"}, 1, "zalctl: seek: value 540000 is out of range"},
        {{"track", "9"}, 1, "zalctl: track: "},
        {{"prefs", "get", "5"}, 1, "zalctl: prefs get: class 5"},
    };
    for (const auto &c : cases) {
        const ProgramResult r = zalctl(c.args);
        EXPECT_EQ(r.status, c.status) << c.args[0] << "\n" << r.out << r.err;
        EXPECT_NE(r.err.find(c.err), std::string::npos) << r.err;
    }
}

TEST_F(ZalctlPlayback, ArtworkOfTheCurrentTrackThroughTheSharedFile) {
#ifndef ZAL_TEST_HAVE_PNG
    GTEST_SKIP() << "built without libpng";
#endif
    ScenarioFile scenario(kArtworkScenario);
    start_sim({"-f", scenario.path()});
    expect_output({"artwork", "--out", png_path}, {"40x30, pixel format 2"});
    const Picture p = read_png(png_path);
    ASSERT_EQ(p.width, 40u);
    ASSERT_EQ(p.height, 30u);
    // The top left corner is the album's colour; the gradient darkens towards the other.
    EXPECT_EQ(p.rgb[0], 255);
    EXPECT_EQ(p.rgb[1], 0);
    EXPECT_EQ(p.rgb[2], 0);
    EXPECT_LT(p.rgb[p.rgb.size() - 3], 255);
}

TEST_F(ZalctlPlayback, ArtworkByIdentifierInline) {
#ifndef ZAL_TEST_HAVE_PNG
    GTEST_SKIP() << "built without libpng";
#endif
    ScenarioFile scenario(kArtworkScenario);
    start_sim({"-f", scenario.path()});
    expect_output({"--device", "1", "--json", "artwork", "--uid", "0x5678", "--out", png_path},
                  {"\"width\":20", "\"pixel_format\":3"});
    const Picture p = read_png(png_path);
    ASSERT_EQ(p.width, 20u);
    ASSERT_EQ(p.height, 10u);
    EXPECT_EQ(p.rgb[0], 0);
    EXPECT_EQ(p.rgb[2], 255);

    const ProgramResult unknown =
        zalctl({"--device", "1", "artwork", "--uid", "7", "-o", png_path});
    EXPECT_EQ(unknown.status, 1);
    EXPECT_EQ(unknown.err, "zalctl: artwork: no track with identifier 0000000000000007\n");
}

}  // namespace
}  // namespace zaltest

// zalctl browse end to end against zald-sim: listing each level of a walk, paging, playing
// the item a path ends with on both devices, the interactive mode driven through stdin, and
// the exit codes of wrong paths and failing walks.
#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdio>
#include <fstream>
#include <nlohmann/json.hpp>

#include "e2e_fixture.h"
#include "sim_fixture.h"
#include "zalctl_fixture.h"

namespace zaltest {
namespace {

using Json = nlohmann::json;

ProgramResult zalctl(const std::vector<std::string> &args, const std::string &input = "") {
#ifdef ZALCTL_PATH
    std::string stdin_path = "/dev/null";
    if (!input.empty()) {
        stdin_path = "/tmp/" + SimProcess::unique_name("zalctl-input");
        std::ofstream(stdin_path) << input;
    }
    ProgramResult r = run_program(ZALCTL_PATH, args, 20000 * kSlowdown, {}, stdin_path);
    if (!input.empty()) unlink(stdin_path.c_str());
    return r;
#else
    (void)args, (void)input;
    return {};
#endif
}

std::string shown(const std::vector<std::string> &args, const ProgramResult &r) {
    std::string text = "zalctl";
    for (const auto &a : args) text += " " + a;
    return text + "\nstatus " + std::to_string(r.status) + "\nstdout:\n" + r.out + "stderr:\n" +
           r.err;
}

class ZalctlBrowseTest : public ZalctlSuite {
  protected:
    // The JSON listing of a path.
    Json listing(std::vector<std::string> args) {
        args.insert(args.begin(), {"--json", "browse"});
        const ProgramResult r = zalctl(args);
        EXPECT_EQ(r.status, 0) << shown(args, r);
        return r.status == 0 ? Json::parse(r.out) : Json::object();
    }
};

struct BrowseCase {
    const char *name;
    std::vector<std::string> args;
    int status;
    std::vector<std::string> out;  // texts standard output must hold
    const char *err;               // text standard error must hold, or null: empty stderr
};

void PrintTo(const BrowseCase &c, std::ostream *os) {
    *os << c.name;
}

const BrowseCase kCases[] = {
    {"top", {"browse"}, 0, {"/\n", "  0  PLAYLIST", "  10  ITUNES_U"}, nullptr},
    {"artists",
     {"browse", "artist", "--count", "3"},
     0,
     {"ARTIST\n", "  0  ", "  2  ", "(1-3 of "},
     nullptr},
    {"a page further",
     {"browse", "artist", "--offset", "2", "--count", "1"},
     0,
     {"  2  ", "(3-3 of "},
     nullptr},
    {"beneath an artist", {"browse", "artist", "0"}, 0, {"  0  ALBUM", "  1  TRACK"}, nullptr},
    {"beneath a track", {"browse", "track", "0"}, 0, {"(a leaf: play it)"}, nullptr},
    {"no such category", {"browse", "singer"}, 2, {}, "no category"},
    {"no index", {"browse", "artist", "first"}, 2, {}, "no item index"},
    {"play needs an item", {"browse", "artist", "--play"}, 2, {}, "--play"},
    {"no such item", {"browse", "artist", "9999"}, 1, {}, "no item 9999"},
};

class ZalctlBrowseCaseTest : public ZalctlBrowseTest,
                             public ::testing::WithParamInterface<BrowseCase> {};

TEST_P(ZalctlBrowseCaseTest, PrintsAndExitsAsExpected) {
    const BrowseCase &c = GetParam();
    start_sim();
    const ProgramResult r = zalctl(c.args);
    ASSERT_EQ(r.status, c.status) << shown(c.args, r);
    for (const std::string &text : c.out)
        EXPECT_NE(r.out.find(text), std::string::npos) << text << " in\n" << shown(c.args, r);
    if (c.err == nullptr)
        EXPECT_EQ(r.err, "");
    else
        EXPECT_NE(r.err.find(c.err), std::string::npos) << shown(c.args, r);
}

INSTANTIATE_TEST_SUITE_P(Paths, ZalctlBrowseCaseTest, ::testing::ValuesIn(kCases),
                         [](const auto &info) {
                             std::string name = info.param.name;
                             for (char &ch : name)
                                 if (!isalnum(static_cast<unsigned char>(ch))) ch = '_';
                             return name;
                         });

// The fourth artist's first album, played on each device, starts with its first track.
TEST_F(ZalctlBrowseTest, PlaysTheAlbumAPathEndsWithOnBothDevices) {
    start_sim();
    for (const char *device : {"0", "1"}) {
        SCOPED_TRACE(device);
        const Json tracks = listing({"--device", device, "artist", "3", "album", "0", "track"});
        ASSERT_FALSE(tracks["items"].empty());
        EXPECT_EQ(tracks["selection"][0], "ARTIST");
        EXPECT_EQ(tracks["selection"][2], "ALBUM");
        const std::vector<std::string> args = {"--device", device,  "--json", "browse", "artist",
                                               "3",        "album", "0",      "--play"};
        const ProgramResult r = zalctl(args);
        ASSERT_EQ(r.status, 0) << shown(args, r);
        const Json played = Json::parse(r.out);
        EXPECT_EQ(played["now_playing"]["title"], tracks["items"][0]) << shown(args, r);
    }
}

TEST_F(ZalctlBrowseTest, APathEndingWithATrackPlaysThatTrack) {
    start_sim();
    const Json tracks = listing({"artist", "1", "track"});
    ASSERT_GT(tracks["items"].size(), 1u);
    const std::vector<std::string> args = {"--json", "browse", "artist", "1",
                                           "track",  "1",      "--play"};
    const ProgramResult r = zalctl(args);
    ASSERT_EQ(r.status, 0) << shown(args, r);
    EXPECT_EQ(Json::parse(r.out)["now_playing"]["title"], tracks["items"][1]);
}

TEST_F(ZalctlBrowseTest, InteractiveWalksBackAndPlaysFromPipedInput) {
    start_sim();
    const Json albums = listing({"artist", "0", "album"});
    ASSERT_FALSE(albums["items"].empty());
    const std::string album = albums["items"][0];
    // artist (1), the first artist (0), ALBUM (0), the first album (0), play, an unknown
    // word, back, quit.
    const std::vector<std::string> args = {"browse", "-i"};
    const ProgramResult r = zalctl(args, "1\n0\n0\n0\np\nwhat\nb\nq\n");
    ASSERT_EQ(r.status, 0) << shown(args, r);
    EXPECT_NE(r.out.find("  1  ARTIST"), std::string::npos) << shown(args, r);
    EXPECT_NE(r.out.find("/ ALBUM / " + album + "\n  0  TRACK"), std::string::npos)
        << shown(args, r);
    EXPECT_NE(r.out.find("playing  "), std::string::npos) << shown(args, r);
    EXPECT_NE(r.err.find("\"what\""), std::string::npos) << shown(args, r);
    // After b the album list is shown again, last.
    const size_t back = r.out.rfind("/ ALBUM\n");
    ASSERT_NE(back, std::string::npos) << shown(args, r);
    EXPECT_NE(r.out.find("  0  " + album, back), std::string::npos) << shown(args, r);
    // The end of the input ends the walk as q does.
    const ProgramResult eof = zalctl(args, "1\n");
    EXPECT_EQ(eof.status, 0) << shown(args, eof);
}

}  // namespace
}  // namespace zaltest

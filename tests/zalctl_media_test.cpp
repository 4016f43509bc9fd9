// zalctl's media library commands against zald-sim's built-in scenario: walking the iAP1
// database across runs, following the iAP2 update stream, play lists and play-items, with
// their output and exit codes.
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

#include "sim_fixture.h"
#include "zalctl_fixture.h"

namespace zaltest {
namespace {

using Json = nlohmann::json;

class ZalctlMediaTest : public ZalctlSuite {
  protected:
    // Runs zalctl, expecting the status; returns standard output.
    std::string run(const std::vector<std::string> &args, int status = 0) {
        const ProgramResult r = zalctl(args);
        EXPECT_EQ(r.status, status) << joined(args) << "\nstdout:\n"
                                    << r.out << "stderr:\n"
                                    << r.err;
        return r.out;
    }
    Json run_json(std::vector<std::string> args) {
        args.insert(args.begin(), "--json");
        const std::string out = run(args);
        const Json doc = Json::parse(out, nullptr, false);
        EXPECT_FALSE(doc.is_discarded()) << out;
        return doc;
    }
};

const CommandCase kCommands[] = {
    {"db_categories",
     {"--device", "1", "db", "categories"},
     0,
     {"TOP: 11 records", "PLAYLIST", "GENIUS_MIXES", "ITUNES_U"},
     nullptr},
    {"db_records_by_name",
     {"--device", "1", "db", "records", "playlist"},
     0,
     {"PLAYLIST: 6 records", "    0  Road Trip", "Recently Added"},
     nullptr},
    {"db_records_page",
     {"--device", "1", "db", "records", "5", "--offset", "1", "--count", "2"},
     0,
     {"TRACK: ", "    1  ", "    2  "},
     nullptr},
    {"db_on_iap2", {"db", "categories"}, 1, {}, "is not an iAP1 device"},
    {"db_unknown_category",
     {"--device", "1", "db", "records", "SONGS"},
     1,
     {},
     "unknown category \"SONGS\""},
    {"db_select_missing_record",
     {"--device", "1", "db", "select", "40", "TRACK"},
     1,
     {},
     "no record 40 in TOP"},
    {"library_updates",
     {"library", "updates"},
     0,
     {"revision 1 (reset): ", "100%", "play lists"},
     nullptr},
    {"library_updates_up_to_date",
     {"library", "updates", "--from", "1"},
     0,
     {"revision 1: 100% +0 items -0 items"},
     nullptr},
    {"library_updates_on_iap1",
     {"--device", "1", "library", "updates"},
     1,
     {},
     "is not an iAP2 device"},
    {"playlists_iap2", {"playlist"}, 0, {"Road Trip (", "Rock Mix ("}, nullptr},
    {"playlists_iap1", {"--device", "1", "playlist"}, 0, {"Road Trip"}, nullptr},
    {"playlist_missing", {"playlist", "Nope"}, 1, {}, "no play list named \"Nope\""},
    {"play_items_unknown", {"play-items", "0x5"}, 1, {}, "unknown track identifier"},
    {"play_items_not_a_number", {"play-items", "five"}, 1, {}, "is not an identifier"},
    {"play_items_start_outside",
     {"play-items", "1", "--start", "1"},
     1,
     {},
     "--start is not in the list"},
};

class ZalctlMediaCommandTest : public ZalctlMediaTest,
                               public ::testing::WithParamInterface<CommandCase> {};

TEST_P(ZalctlMediaCommandTest, PrintsAndExitsAsExpected) {
    start_sim();
    expect_command(GetParam());
}

INSTANTIATE_TEST_SUITE_P(BuiltInScenario, ZalctlMediaCommandTest, ::testing::ValuesIn(kCommands),
                         [](const auto &info) { return std::string(info.param.name); });

TEST(ZalctlMediaUsage, WrongCommandLinesExitWithTwo) {
#ifndef ZALCTL_PATH
    GTEST_SKIP() << "zalctl is not built";
#endif
    for (const std::vector<std::string> &args :
         std::vector<std::vector<std::string>>{{"db"},
                                               {"db", "records"},
                                               {"db", "select", "1"},
                                               {"db", "play", "-1"},
                                               {"library"},
                                               {"library", "updates", "--for", "0"},
                                               {"play-items"}}) {
        const ProgramResult r = zalctl(args);
        EXPECT_EQ(r.status, 2) << joined(args) << "\n" << r.err;
        EXPECT_EQ(r.out, "") << joined(args);
    }
}

// The walk is the device's: each run goes on from where the last one left it, down to a
// play list's tracks, and playing one changes what the player plays.
TEST_F(ZalctlMediaTest, DatabaseWalkAcrossRunsPlaysATrackOfAPlayList) {
    start_sim();
    run({"--device", "1", "db", "categories"});
    EXPECT_NE(run({"--device", "1", "db", "records", "PLAYLIST"}).find("Road Trip"),
              std::string::npos);
    const Json selected = run_json({"--device", "1", "db", "select", "0", "TRACK"});
    const int tracks = selected.value("total", 0);
    ASSERT_GT(tracks, 3);
    const Json listing = run_json({"--device", "1", "db", "tracks"});
    ASSERT_EQ(listing.at("tracks").size(), static_cast<size_t>(tracks));
    const std::string third = listing.at("tracks").at(2).at("name");
    const Json played = run_json({"--device", "1", "db", "play", "2"});
    EXPECT_EQ(played.at("now_playing").at("title"), third);
    EXPECT_EQ(played.at("now_playing").at("number_of_tracks"), tracks);
    // The same identifiers play again through a prepared list, from the second.
    const std::string first_uid = listing.at("tracks").at(0).at("uid");
    const std::string second_uid = listing.at("tracks").at(1).at("uid");
    const Json again =
        run_json({"--device", "1", "play-items", first_uid, second_uid, "--start", "1"});
    EXPECT_EQ(again.at("now_playing").at("title"), listing.at("tracks").at(1).at("name"));
    EXPECT_EQ(again.at("now_playing").at("number_of_tracks"), 2);
}

TEST_F(ZalctlMediaTest, Iap2PlaysAPlayListAndItemsFromTheUpdateStream) {
    start_sim();
    const Json lists = run_json({"playlist"});
    ASSERT_FALSE(lists.at("playlists").empty());
    EXPECT_EQ(lists.at("mlid"), "SIMLIB-SIMPHONE0001");
    const std::string out = run({"playlist", "Road Trip", "--start", "1"});
    EXPECT_NE(out.find("playing"), std::string::npos) << out;
    EXPECT_EQ(out.find("Morning Drive"), std::string::npos) << out;
    // Identifiers as the stream lists them play as items.
    const std::string items = run({"library", "updates", "--items"});
    const size_t plus = items.find("  + 0x");
    ASSERT_NE(plus, std::string::npos) << items;
    const std::string uid = items.substr(plus + 4, 18);
    const size_t title_at = plus + 4 + 18 + 2;
    const std::string title = items.substr(title_at, items.find(" - ", title_at) - title_at);
    const Json played = run_json({"play-items", uid});
    EXPECT_EQ(played.at("now_playing").at("title"), title);
}

}  // namespace
}  // namespace zaltest

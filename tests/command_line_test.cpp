// The daemon's command line: defaults, each option's effect, failures that stop parsing,
// the usage text, and the log destination of -d.
#include <android/log.h>
#include <fcntl.h>
#include <gtest/gtest.h>

#include <cstdio>
#include <fstream>
#include <optional>
#include <string>
#include <vector>

#include "common/platform/properties.h"
#include "daemon_support.h"
#include "log_capture.h"
#include "zal-ipod-2/common.h"
#include "zal-ipod-2/daemon.h"

namespace {

using zaltest::OwnedContext;
using Lines = std::vector<std::string>;

// The usage text as a reader of the daemon's help sees it, for program "zald-2".
const Lines kUsage = {
    "",
    "zald-2: accessory daemon for media devices over iAP1 and iAP2",
    "",
    "Usage:",
    " zald-2 [options]",
    "Options",
    " -t device            Set target device (default is 'general')",
    "                      supported target devices",
    " -b mac_address       The mac address of the bluetooth component",
    " -i [1|2]             iAP protocol version to use",
    "                      Default value is 2",
    "                      If accessory does not support iAP2, the daemon will fallback to iAP1",
    " -e protocolName1,protocolName2,...   List of EAP protocol names",
    "                        - Example: com.example.remote,com.example.telemetry",
    " -a app_ID            App match team ID",
    "                        - Example: A1B2C3D4E5",
    " -l path              Path to a shared library implementing the USB host plugin header",
    " -m path              Path to a shared library implementing the Media Library plugin header",
    " -u                   Set unix domain socket path",
    " -d path              dump log message into specific destination",
    "                        - stdout (default)",
    "                        - /path/to/log-file",
    " -f path               Path to configuration file implementing for zald-2",
    "Example",
    " zald-2 -v",
};

Lines with_usage(Lines before) {
    before.insert(before.end(), kUsage.begin(), kUsage.end());
    return before;
}

const std::string kNoAddress =
    "CONFIG ERROR: Unable to read BlueTooth hci0 MAC address from "
    "/sys/class/bluetooth/hci0/address";
const std::string kHexAddress = "CONFIG ERROR: Please provide BlueTooth MAC address in hex format";
const std::string kNoName =
    "CONFIG ERROR: Unable to read BlueTooth hci0 name from /sys/class/bluetooth/hci0/name ";

enum class Sysfs { kEmpty, kAddressAndName, kAddressOnly };

// Fields a row checks; unset ones are not compared.
struct Fields {
    std::optional<std::string> device{}, socket_name{}, config_path{}, bt_address{}, bt_name{};
    std::optional<int32_t> protocol_mode{}, engine_type{};
    std::optional<std::vector<std::optional<std::string>>> eap{};
    std::optional<std::optional<std::string>> team_id{};
};

struct Row {
    const char *what;
    std::vector<std::string> args;  // after the program name
    Sysfs sysfs;
    int result;
    Fields fields;
    Lines out;
};

using Names = std::vector<std::optional<std::string>>;

const std::string kLong40(40, 'd');
const std::string kLong300(300, 's');

const Row kRows[] = {
    {"no options: defaults",
     {},
     Sysfs::kEmpty,
     0,
     {.device = "general",
      .socket_name = "zal.ipod.IPodDaemon",
      .config_path = "",
      .bt_address = "",
      .engine_type = -1},
     {}},
    {"fields from -t -u -f",
     {"-t", "car", "-u", "zal.test.sock", "-f", "/etc/zald.conf"},
     Sysfs::kEmpty,
     0,
     {.device = "car", .socket_name = "zal.test.sock", .config_path = "/etc/zald.conf"},
     {}},
    {"a later option overwrites",
     {"-t", "first", "-t", "second"},
     Sysfs::kEmpty,
     0,
     {.device = "second"},
     {}},
    {"long device name is cut to 31",
     {"-t", kLong40},
     Sysfs::kEmpty,
     0,
     {.device = kLong40.substr(0, 31)},
     {}},
    {"long socket name is cut to 255",
     {"-u", kLong300},
     Sysfs::kEmpty,
     0,
     {.socket_name = kLong300.substr(0, 255)},
     {}},
    {"-i 2", {"-i", "2"}, Sysfs::kEmpty, 0, {.protocol_mode = 2}, {}},
    {"-i 3 has no upper bound", {"-i", "3"}, Sysfs::kEmpty, 0, {.protocol_mode = 3}, {}},
    {"-i 0 stores 1", {"-i", "0"}, Sysfs::kEmpty, 0, {.protocol_mode = 1}, {}},
    {"-i -3 stores 1", {"-i", "-3"}, Sysfs::kEmpty, 0, {.protocol_mode = 1}, {}},
    {"-i x stores 1", {"-i", "x"}, Sysfs::kEmpty, 0, {.protocol_mode = 1}, {}},
    {"-i empty leaves the field", {"-i", ""}, Sysfs::kEmpty, 0, {.protocol_mode = 7}, {}},
    {"-e skips empty pieces",
     {"-e", "a,b,,c"},
     Sysfs::kEmpty,
     0,
     {.eap = Names{"a", "b", "c"}},
     {}},
    {"-e leading comma", {"-e", ",a"}, Sysfs::kEmpty, 0, {.eap = Names{std::nullopt, "a"}}, {}},
    {"-e trailing comma", {"-e", "a,"}, Sysfs::kEmpty, 0, {.eap = Names{"a"}}, {}},
    {"-e empty", {"-e", ""}, Sysfs::kEmpty, 0, {.eap = Names{}}, {}},
    {"-e replaces the list", {"-e", "x,z", "-e", "y"}, Sysfs::kEmpty, 0, {.eap = Names{"y"}}, {}},
    {"-a ten characters",
     {"-a", "ABCDE12345"},
     Sysfs::kEmpty,
     0,
     {.team_id = std::optional<std::string>("ABCDE12345")},
     {}},
    {"-a empty clears",
     {"-a", "ABCDE12345", "-a", ""},
     Sysfs::kEmpty,
     0,
     {.team_id = std::optional<std::string>()},
     {}},
    {"-a wrong length fails",
     {"-a", "123"},
     Sysfs::kEmpty,
     1,
     {.team_id = std::optional<std::string>()},
     kUsage},
    {"failure keeps earlier options and skips later ones",
     {"-t", "first", "-a", "123", "-t", "second"},
     Sysfs::kEmpty,
     1,
     {.device = "first"},
     kUsage},
    {"-b text is stored unchecked, then the name is read",
     {"-b", "00:11:22:33:44:55"},
     Sysfs::kAddressAndName,
     0,
     {.bt_address = "00:11:22:33:44:55", .bt_name = "Head"},
     {"", " ######### NAME : Head "}},
    {"-b without a readable name goes on",
     {"-b", "not-a-mac", "-t", "after"},
     Sysfs::kEmpty,
     0,
     {.device = "after", .bt_address = "not-a-mac", .bt_name = "kept"},
     {kNoName}},
    {"-b localhost reads the adapter address",
     {"-b", "localhost"},
     Sysfs::kAddressOnly,
     0,
     {.bt_address = "aa:bb:cc:dd:ee:ff"},
     {kNoName}},
    {"-b localhost without an adapter fails",
     {"-b", "localhost"},
     Sysfs::kEmpty,
     1,
     {.bt_address = ""},
     with_usage({kNoAddress, kHexAddress})},
    {"-h", {"-h"}, Sysfs::kEmpty, 1, {}, kUsage},
    {"unknown option", {"-x"}, Sysfs::kEmpty, 1, {}, kUsage},
    {"missing argument", {"-t"}, Sysfs::kEmpty, 1, {}, kUsage},
    {"-l whose init fails goes on",
     {"-l", ZAL_TEST_PLUGIN_USB_INIT_FAILS, "-t", "after"},
     Sysfs::kEmpty,
     0,
     {.device = "after"},
     {"CONFIG ERROR: USB init mode is not host mode "}},
    {"-m that cannot load fails",
     {"-m", "/nonexistent/libmedia.so"},
     Sysfs::kEmpty,
     1,
     {},
     with_usage({"CONFIG ERROR: Unable to load media library plugin. Error: "
                 "/nonexistent/libmedia.so: cannot open shared object file: No such file or "
                 "directory",
                 ""})},
    {"-m that loads", {"-m", ZAL_TEST_PLUGIN_NO_ENTRY_POINTS}, Sysfs::kEmpty, 0, {}, {}},
};

Names eap_names(const context &ctx) {
    Names names;
    for (const eap_node *n = ctx.eap; n != nullptr; n = n->next)
        names.push_back(n->name ? std::optional<std::string>(n->name) : std::nullopt);
    return names;
}

int parse(const std::vector<std::string> &args, context *ctx) {
    std::vector<std::string> storage = {"zald-2"};
    storage.insert(storage.end(), args.begin(), args.end());
    std::vector<char *> argv;
    for (std::string &s : storage) argv.push_back(s.data());
    argv.push_back(nullptr);
    return parse_arguments(static_cast<int>(storage.size()), argv.data(), ctx);
}

void PrintTo(const Row &row, std::ostream *os) {
    *os << row.what;
}

class CommandLine : public testing::TestWithParam<Row> {};

TEST_P(CommandLine, ParsesAsExpected) {
    const Row &row = GetParam();
    std::optional<zaltest::FakeSysfs> sysfs;
    if (row.sysfs == Sysfs::kAddressAndName) sysfs.emplace("00:00:00:00:00:01\n", "Head Unit\n");
    if (row.sysfs == Sysfs::kAddressOnly) sysfs.emplace("aa:bb:cc:dd:ee:ff\n", nullptr);
    if (row.sysfs == Sysfs::kEmpty) sysfs.emplace(nullptr, nullptr);

    OwnedContext owned;
    context &ctx = owned.ctx;
    // What the daemon put there before parsing; the command line must not disturb it.
    ctx.highest_protocol_mode = 7;
    std::snprintf(ctx.bt_name, sizeof ctx.bt_name, "kept");
    std::snprintf(ctx.bt_address, sizeof ctx.bt_address, "stale");
    std::snprintf(ctx.config_path, sizeof ctx.config_path, "stale");
    ctx.vehicle_information_component_engine_type = 9;

    zaltest::LogCapture log;
    zaltest::StdoutCapture out;
    EXPECT_EQ(parse(row.args, &ctx), row.result);
    EXPECT_EQ(out.lines(), row.out);

    const Fields &f = row.fields;
    auto check = [](const auto &want, const auto &got, const char *field) {
        if (want) {
            EXPECT_EQ(got, *want) << field;
        }
    };
    check(f.device, std::string(ctx.device), "device");
    check(f.socket_name, std::string(ctx.socket_name), "socket_name");
    check(f.config_path, std::string(ctx.config_path), "config_path");
    check(f.bt_address, std::string(ctx.bt_address), "bt_address");
    check(f.bt_name, std::string(ctx.bt_name), "bt_name");
    check(f.protocol_mode, ctx.highest_protocol_mode, "highest_protocol_mode");
    check(f.engine_type, ctx.vehicle_information_component_engine_type, "engine_type");
    check(f.eap, eap_names(ctx), "eap");
    if (f.team_id) {
        if (*f.team_id) {
            ASSERT_NE(ctx.app_match_team_id, nullptr);
            EXPECT_STREQ(ctx.app_match_team_id, (*f.team_id)->c_str());
        } else {
            EXPECT_EQ(ctx.app_match_team_id, nullptr);
        }
    }
}

INSTANTIATE_TEST_SUITE_P(Rows, CommandLine, testing::ValuesIn(kRows),
                         [](const testing::TestParamInfo<Row> &info) {
                             return "row" + std::to_string(info.index);
                         });

TEST(CommandLineErrors, TeamIdLengthIsLoggedAsAnError) {
    OwnedContext owned;
    zaltest::LogCapture log;
    zaltest::StdoutCapture out;
    EXPECT_EQ(parse({"-a", "123"}, &owned.ctx), 1);
    std::vector<std::string> errors = log.texts(ANDROID_LOG_ERROR);
    ASSERT_EQ(errors.size(), 2u);
    EXPECT_EQ(errors[0], "app_match_team_id most have exactly 10 characters\n");
    EXPECT_EQ(errors[1].rfind("  set_context_app_match_team_id:", 0), 0u) << errors[1];
}

TEST(CommandLineErrors, UsbPluginFailureDependsOnTheUsbProperty) {
    platform_property_clear();
    platform_property_set("sys.usb.config", "host");
    OwnedContext owned;
    zaltest::LogCapture log;
    {
        zaltest::StdoutCapture out;
        EXPECT_EQ(parse({"-l", "/nonexistent/libusb.so", "-t", "after"}, &owned.ctx), 1);
        EXPECT_EQ(out.lines(), kUsage);
    }
    EXPECT_STREQ(owned.ctx.device, "general");

    platform_property_set("sys.usb.config", "mtp,adb");
    {
        zaltest::StdoutCapture out;
        EXPECT_EQ(parse({"-l", "/nonexistent/libusb.so", "-t", "after"}, &owned.ctx), 0);
        EXPECT_EQ(out.lines(), Lines{});
    }
    EXPECT_STREQ(owned.ctx.device, "after");
    platform_property_clear();
}

TEST(CommandLineUsage, NamesTheProgramFromArgv0) {
    OwnedContext owned;
    char program[] = "/system/bin/zald-2";
    char help[] = "-h";
    char *argv[] = {program, help, nullptr};
    zaltest::StdoutCapture out;
    EXPECT_EQ(parse_arguments(2, argv, &owned.ctx), 1);
    Lines lines = out.lines();
    ASSERT_EQ(lines.size(), kUsage.size());
    EXPECT_EQ(lines[4], " /system/bin/zald-2 [options]");
    EXPECT_EQ(lines.back(), " /system/bin/zald-2 -v");
}

// -d changes the process-wide stream; each case puts standard output back.
class LogDestination : public testing::Test {
  protected:
    void TearDown() override {
        OwnedContext owned;
        parse({"-d", "stdout"}, &owned.ctx);  // also closes a file an earlier -d opened
        common_log_init();
    }
};

TEST_F(LogDestination, StdoutSelectsStandardOutput) {
    _log_fp = nullptr;
    OwnedContext owned;
    EXPECT_EQ(parse({"-d", "stdout"}, &owned.ctx), 0);
    EXPECT_EQ(_log_fp, stdout);
}

TEST_F(LogDestination, FileIsTruncatedAndReceivesTheStamps) {
    std::filesystem::path path = zaltest::temp_path("zal-log");
    std::ofstream(path) << "old content that must go\n";
    OwnedContext owned;
    EXPECT_EQ(parse({"-d", path.string()}, &owned.ctx), 0);
    ASSERT_NE(_log_fp, nullptr);
    ASSERT_NE(_log_fp, stdout);
    print_time_stamp();
    fflush(_log_fp);
    std::ifstream in(path);
    std::string text((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
    EXPECT_EQ(text.find("old content"), std::string::npos);
    EXPECT_EQ(text.front(), '[') << text;
    std::filesystem::remove(path);
}

TEST_F(LogDestination, ALaterDestinationClosesTheFileOfAnEarlierOne) {
    std::filesystem::path first = zaltest::temp_path("zal-log");
    std::filesystem::path second = zaltest::temp_path("zal-log");
    OwnedContext owned;
    ASSERT_EQ(parse({"-d", first.string()}, &owned.ctx), 0);
    ASSERT_NE(_log_fp, stdout);
    int first_fd = fileno(_log_fp);
    ASSERT_EQ(parse({"-d", second.string()}, &owned.ctx), 0);
    EXPECT_NE(fileno(_log_fp), first_fd);
    EXPECT_EQ(fcntl(first_fd, F_GETFD), -1) << "the first log file is still open";
    std::filesystem::remove(first);
    std::filesystem::remove(second);
}

TEST_F(LogDestination, UnopenableFileFallsBackToStdoutAndParsingGoesOn) {
    _log_fp = nullptr;
    OwnedContext owned;
    zaltest::StdoutCapture out;
    EXPECT_EQ(parse({"-d", "/nonexistent-dir/zald.log", "-t", "after"}, &owned.ctx), 0);
    EXPECT_EQ(out.lines(),
              Lines{"CONFIG ERROR: Unable to open log file /nonexistent-dir/zald.log (No such file "
                    "or directory), logging to stdout"});
    EXPECT_EQ(_log_fp, stdout);
    EXPECT_STREQ(owned.ctx.device, "after");
}

}  // namespace

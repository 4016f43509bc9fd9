// Plug-in loading: entry points resolved by name into their slots, the USB plug-in's
// initialisation at load, and the property fallback when the USB plug-in will not load.
#include <dlfcn.h>
#include <android/log.h>
#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "common/platform/properties.h"
#include "daemon_support.h"
#include "log_capture.h"
#include "zal-ipod-2/daemon.h"

namespace {

using zaltest::OwnedContext;
using Lines = std::vector<std::string>;

// The slot records seen as arrays, in their declared order.
constexpr size_t kUsbSlots = sizeof(ipod_usb_host_entry_points) / sizeof(void *);
constexpr size_t kMediaSlots = sizeof(ipod_media_library_entry_points) / sizeof(void *);
static_assert(kUsbSlots == 5 && kMediaSlots == 17);

template <class Record>
std::vector<void *> slots(const Record &record) {
    std::vector<void *> out(sizeof(Record) / sizeof(void *));
    std::memcpy(out.data(), &record, sizeof(Record));
    return out;
}

// The names each slot must hold, written independently of the loader's tables.
const char *const kUsbNames[kUsbSlots] = {"ipod_platform_init", "ipod_is_host_mode_supported",
                                          "ipod_to_host_mode", "ipod_to_device_mode",
                                          "ipod_is_host_mode_connected"};
const char *const kMediaNames[kMediaSlots] = {
    "ipod_media_library_get_media_library_last_known_revision",
    "ipod_media_library_insert_media_library_if_not_exists",
    "ipod_media_library_update_media_library_last_known_revision",
    "ipod_media_library_insert_track",
    "ipod_media_library_insert_playlist",
    "ipod_media_library_insert_track_playlist",
    "ipod_media_library_delete_media_item",
    "ipod_media_library_delete_media_playlist",
    "ipod_media_library_delete_media_tracks_playlist",
    "ipod_media_library_get_items_current_category",
    "ipod_media_library_get_collection_id",
    "ipod_media_library_get_tracks_info_current_filter",
    "ipod_media_library_reset_database_for_mlid",
    "ipod_media_library_start_transaction",
    "ipod_media_library_end_transaction",
    "ipod_media_library_init",
    "ipod_media_library_finish",
};

// A handle of our own on an already loaded plug-in, to look its symbols up independently.
struct Library {
    void *handle;
    explicit Library(const char *path) : handle(dlopen(path, RTLD_NOW | RTLD_LOCAL)) {}
    ~Library() {
        if (handle) dlclose(handle);
    }
    void *symbol(const char *name) const { return dlsym(handle, name); }
};

// Stand-ins that a failed load must leave in their slots.
int earlier_to_host_mode() {
    return 0;
}
int earlier_init(const char *) {
    return 0;
}
void earlier_finish() {}

TEST(UsbHostPlugin, EverySlotHoldsTheFunctionOfItsNameAndInitRunsOnce) {
    OwnedContext owned;
    zaltest::StdoutCapture out;
    EXPECT_EQ(set_context_usb_host_plugin(&owned.ctx, ZAL_TEST_PLUGIN_ALL_ENTRY_POINTS), 1);
    EXPECT_EQ(out.lines(), Lines{});
    Library lib(ZAL_TEST_PLUGIN_ALL_ENTRY_POINTS);
    ASSERT_NE(lib.handle, nullptr) << dlerror();
    std::vector<void *> got = slots(owned.ctx.usb_host);
    for (size_t i = 0; i < kUsbSlots; ++i) {
        ASSERT_NE(lib.symbol(kUsbNames[i]), nullptr) << kUsbNames[i];
        EXPECT_EQ(got[i], lib.symbol(kUsbNames[i])) << kUsbNames[i];
    }
    EXPECT_EQ(*static_cast<int *>(lib.symbol("test_platform_init_calls")), 1);
    EXPECT_EQ(owned.ctx.usb_host.ipod_is_host_mode_supported(), 1);
}

TEST(UsbHostPlugin, OnlyTheDefinedEntryPointIsSetAndNoInitRuns) {
    OwnedContext owned;
    EXPECT_EQ(set_context_usb_host_plugin(&owned.ctx, ZAL_TEST_PLUGIN_USB_TO_HOST_ONLY), 1);
    EXPECT_EQ(owned.ctx.usb_host.ipod_platform_init, nullptr);
    EXPECT_EQ(owned.ctx.usb_host.ipod_is_host_mode_supported, nullptr);
    ASSERT_NE(owned.ctx.usb_host.ipod_to_host_mode, nullptr);
    EXPECT_EQ(owned.ctx.usb_host.ipod_to_host_mode(), 0);
    EXPECT_EQ(owned.ctx.usb_host.ipod_to_device_mode, nullptr);
    EXPECT_EQ(owned.ctx.usb_host.ipod_is_host_mode_connected, nullptr);
}

TEST(UsbHostPlugin, FailedInitIsReportedAfterEveryEntryPointWasStored) {
    OwnedContext owned;
    zaltest::StdoutCapture out;
    EXPECT_EQ(set_context_usb_host_plugin(&owned.ctx, ZAL_TEST_PLUGIN_USB_INIT_FAILS), -1);
    EXPECT_EQ(out.lines(), Lines{"CONFIG ERROR: USB init mode is not host mode "});
    ASSERT_NE(owned.ctx.usb_host.ipod_platform_init, nullptr);
    EXPECT_EQ(owned.ctx.usb_host.ipod_platform_init(), -5);
    EXPECT_NE(owned.ctx.usb_host.ipod_to_host_mode, nullptr);
}

struct UnloadableUsbRow {
    const char *what;
    const char *path;
    const char *usb_config_before;  // null: the property is not set
    int result;
    const char *usb_config_after;
    const char *ctl_stop_after;
};

const UnloadableUsbRow kUnloadableUsbRows[] = {
    {"property unset", "/nonexistent/libusb.so", nullptr, -1, "host", "mdnsd_carplay"},
    {"property in device mode", "/nonexistent/libusb.so", "mtp,adb", -1, "host", "mdnsd_carplay"},
    {"property already host", "/nonexistent/libusb.so", "host", 0, "host", ""},
    {"not a library", "/etc/hostname", "mtp", -1, "host", "mdnsd_carplay"},
    {"empty path is not the program itself", "", "mtp", -1, "host", "mdnsd_carplay"},
};

void PrintTo(const UnloadableUsbRow &row, std::ostream *os) {
    *os << row.what;
}

class UnloadableUsbPlugin : public testing::TestWithParam<UnloadableUsbRow> {};

TEST_P(UnloadableUsbPlugin, FallsBackToTheUsbProperty) {
    const UnloadableUsbRow &row = GetParam();
    platform_property_clear();
    if (row.usb_config_before) platform_property_set("sys.usb.config", row.usb_config_before);
    OwnedContext owned;
    ipod_to_host_mode_fn *sentinel = earlier_to_host_mode;
    owned.ctx.usb_host.ipod_to_host_mode = sentinel;

    zaltest::LogCapture log;
    EXPECT_EQ(set_context_usb_host_plugin(&owned.ctx, row.path), row.result);

    char value[kPlatformPropertyValueMax];
    platform_property_get("sys.usb.config", value, "");
    EXPECT_STREQ(value, row.usb_config_after);
    platform_property_get("ctl.stop", value, "");
    EXPECT_STREQ(value, row.ctl_stop_after);
    EXPECT_EQ(owned.ctx.usb_host.ipod_to_host_mode, sentinel) << "earlier entry points kept";

    std::vector<std::string> errors = log.texts(ANDROID_LOG_ERROR);
    ASSERT_EQ(errors.size(), 2u);
    EXPECT_EQ(errors[0],
              std::string("CONFIG ERROR: Unable to load USB host plugin library. from ") +
                  row.path + " \n\n");
    EXPECT_EQ(errors[1].rfind("  set_context_usb_host_plugin:", 0), 0u) << errors[1];
    platform_property_clear();
}

INSTANTIATE_TEST_SUITE_P(Rows, UnloadableUsbPlugin, testing::ValuesIn(kUnloadableUsbRows),
                         [](const testing::TestParamInfo<UnloadableUsbRow> &info) {
                             return "row" + std::to_string(info.index);
                         });

TEST(MediaLibraryPlugin, EverySlotHoldsTheFunctionOfItsNameAndNothingIsCalled) {
    OwnedContext owned;
    EXPECT_EQ(set_context_media_library_plugin(&owned.ctx, ZAL_TEST_PLUGIN_ALL_ENTRY_POINTS), 1);
    Library lib(ZAL_TEST_PLUGIN_ALL_ENTRY_POINTS);
    ASSERT_NE(lib.handle, nullptr) << dlerror();
    std::vector<void *> got = slots(owned.ctx.media_library);
    for (size_t i = 0; i < kMediaSlots; ++i) {
        ASSERT_NE(lib.symbol(kMediaNames[i]), nullptr) << kMediaNames[i];
        EXPECT_EQ(got[i], lib.symbol(kMediaNames[i])) << kMediaNames[i];
    }
    EXPECT_EQ(slots(owned.ctx.usb_host), std::vector<void *>(kUsbSlots, nullptr));
}

TEST(MediaLibraryPlugin, LibraryWithoutTheNamesGivesNullSlots) {
    OwnedContext owned;
    owned.ctx.media_library.init = earlier_init;
    EXPECT_EQ(set_context_media_library_plugin(&owned.ctx, ZAL_TEST_PLUGIN_NO_ENTRY_POINTS), 1);
    EXPECT_EQ(slots(owned.ctx.media_library), std::vector<void *>(kMediaSlots, nullptr));
}

TEST(MediaLibraryPlugin, UnloadableLibraryPrintsTheLoaderReasonAndKeepsTheSlots) {
    OwnedContext owned;
    ipod_media_library_finish_fn *sentinel = earlier_finish;
    owned.ctx.media_library.finish = sentinel;
    zaltest::StdoutCapture out;
    EXPECT_EQ(set_context_media_library_plugin(&owned.ctx, "/nonexistent/libmedia.so"), 0);
    EXPECT_EQ(out.lines(),
              (Lines{"CONFIG ERROR: Unable to load media library plugin. Error: "
                     "/nonexistent/libmedia.so: cannot open shared object file: No such file or "
                     "directory",
                     ""}));
    EXPECT_EQ(owned.ctx.media_library.finish, sentinel);
}

TEST(MediaLibraryPlugin, EmptyPathIsRefusedWithoutLoadingTheProgram) {
    OwnedContext owned;
    zaltest::StdoutCapture out;
    EXPECT_EQ(set_context_media_library_plugin(&owned.ctx, nullptr), 0);
    EXPECT_EQ(
        out.lines(),
        (Lines{"CONFIG ERROR: Unable to load media library plugin. Error: no library path", ""}));
}

}  // namespace

// Layout of the daemon's records for both data models we ship on, ILP32 (the head unit)
// and LP64 (the development host). The daemon and prebuilt plug-ins are compiled apart
// from this library, so a change of an offset here is an ABI break.
#include <gtest/gtest.h>

#include <cstddef>

#include "zal-ipod-2/daemon.h"
#include "zal-ipod-2/plugin.h"

namespace {

constexpr bool kIlp32 = sizeof(void *) == 4;
constexpr std::size_t by_model(std::size_t ilp32, std::size_t lp64) {
    return kIlp32 ? ilp32 : lp64;
}

static_assert(offsetof(context, socket_name) == 32);
static_assert(offsetof(context, bt_name) == 800);
static_assert(offsetof(context, eap) == 1056);
static_assert(offsetof(context, app_match_team_id) == by_model(1060, 1064));
static_assert(offsetof(context, highest_protocol_mode) == by_model(1064, 1072));
static_assert(offsetof(context, media_library_db_path) == by_model(1068, 1076));
static_assert(offsetof(context, vehicle_information_component_engine_type) == by_model(1836, 1844));
static_assert(offsetof(context, accessory_wifi_passphrase) == by_model(2352, 2360));
static_assert(offsetof(context, usb_host) == by_model(2608, 2616));
static_assert(offsetof(context, media_library) == by_model(2628, 2656));
static_assert(offsetof(context, daemon_private) == by_model(2696, 2792));
static_assert(sizeof(context) == by_model(2712, 2824));

static_assert(offsetof(eap_node, next) == by_model(4, 8));

static_assert(offsetof(zal_attached_device, serial) == by_model(4, 8));
static_assert(offsetof(zal_attached_device, protocol) == by_model(324, 328));
static_assert(offsetof(zal_attached_device, link_state) == by_model(332, 336));
static_assert(offsetof(zal_attached_device, usb_bus) == by_model(352, 356));
static_assert(offsetof(zal_attached_device, rfcomm_channel) == by_model(354, 358));
static_assert(offsetof(zal_attached_device, daemon_data) == by_model(356, 360));
static_assert(sizeof(zal_attached_device) == by_model(360, 368));
static_assert(sizeof(zal_device_registry) == by_model(8, 16));

// 64-bit identifiers are 8-aligned on both models (the ARM EABI aligns them like LP64).
static_assert(offsetof(ipod_media_track, duration_ms) == by_model(32, 56));
static_assert(offsetof(ipod_media_track, rating) == by_model(48, 72));
static_assert(sizeof(ipod_media_track) == by_model(56, 80));
static_assert(offsetof(ipod_media_playlist, is_genius_mix) == by_model(24, 28));
static_assert(sizeof(ipod_media_playlist) == 32);
static_assert(offsetof(ipod_media_filter, ids) == 8);
static_assert(sizeof(ipod_media_filter) == 104);

TEST(DaemonLayout, EntryPointTablesHoldOnePointerPerEntryPoint) {
    EXPECT_EQ(sizeof(ipod_usb_host_entry_points), 5 * sizeof(void *));
    EXPECT_EQ(sizeof(ipod_media_library_entry_points), 17 * sizeof(void *));
}

}  // namespace

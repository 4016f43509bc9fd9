// The daemon's registry of attached devices and the device list that clients receive.
#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "value_builders.h"
#include "zal-ipod-2/daemon.h"

extern "C" int devices_c_entry_count(void);

namespace {

using zaltest::GvalPtr;

zal_attached_device make_device(const char *serial, int32_t link_kind, int32_t usb_role) {
    zal_attached_device d{};
    std::snprintf(d.serial, sizeof d.serial, "%s", serial);
    std::snprintf(d.name, sizeof d.name, "Phone %s", serial);
    d.protocol = 1;
    d.link_kind = link_kind;
    d.usb_role = usb_role;
    d.usb_bus = 3;
    d.usb_address = 200;  // above 127: must not come out negative
    d.rfcomm_channel = 12;
    return d;
}

struct Registry {
    zal_device_registry r{};
    ~Registry() { zal_device_registry_clear(&r); }
};

int32_t int_at(const gval *entry, const char *key) {
    const gval *v = serialize_hash_get(entry, key);
    EXPECT_NE(v, nullptr) << key;
    if (v == nullptr) return INT32_MIN;
    EXPECT_EQ(serialize_type(v), SERIALIZE_INT) << key;
    return serialize_get_int(v);
}

struct TransportRow {
    const char *what;
    int32_t link_kind, usb_role;
    int32_t transport, bus, address, rfcomm;
};

const TransportRow kTransportRows[] = {
    {"bluetooth", ZAL_LINK_BLUETOOTH, 0, 2, -1, -1, 12},
    {"bluetooth ignores the usb role", ZAL_LINK_BLUETOOTH, 1, 2, -1, -1, 12},
    {"usb with role 1", ZAL_LINK_USB, 1, 1, -1, -1, -1},
    {"usb with role 0", ZAL_LINK_USB, 0, 0, 3, 200, -1},
    {"usb with role 2", ZAL_LINK_USB, 2, 0, 3, 200, -1},
    {"fourth link kind", ZAL_LINK_OTHER, 1, 3, -1, -1, -1},
    {"link kind 0", 0, 0, -1, -1, -1, -1},
    {"link kind 3", 3, 1, -1, -1, -1, -1},
};

class Transport : public testing::TestWithParam<TransportRow> {};

TEST_P(Transport, LinkDecidesTransportAndReportedNumbers) {
    const TransportRow &row = GetParam();
    Registry reg;
    zal_attached_device d = make_device("S1", row.link_kind, row.usb_role);
    ASSERT_NE(zal_device_registry_add(&reg.r, &d), nullptr);
    GvalPtr list(get_current_devices(&reg.r));
    ASSERT_NE(list, nullptr);
    ASSERT_EQ(serialize_array_count(list.get()), 1);
    const gval *entry = serialize_array_get(list.get(), 0);
    EXPECT_EQ(int_at(entry, "transport"), row.transport);
    EXPECT_EQ(int_at(entry, "bus"), row.bus);
    EXPECT_EQ(int_at(entry, "address"), row.address);
    EXPECT_EQ(int_at(entry, "rfcommId"), row.rfcomm);
}

INSTANTIATE_TEST_SUITE_P(Rows, Transport, testing::ValuesIn(kTransportRows),
                         [](const testing::TestParamInfo<TransportRow> &info) {
                             return "row" + std::to_string(info.index);
                         });

TEST(CurrentDevices, EntryHoldsEveryKeyInWireOrder) {
    Registry reg;
    zal_attached_device d = make_device("ABC123", ZAL_LINK_USB, 0);
    d.link_state = {1, 1, 1};
    zal_device_registry_add(&reg.r, &d);
    GvalPtr list(get_current_devices(&reg.r));
    const gval *entry = serialize_array_get(list.get(), 0);
    ASSERT_EQ(serialize_type(entry), SERIALIZE_HASH);
    const std::vector<std::string> keys = {"serial",   "name",          "authenticated", "used",
                                           "extended", "protocolinuse", "transport",     "bus",
                                           "address",  "rfcommId"};
    ASSERT_EQ(serialize_hash_count(entry), static_cast<int>(keys.size()));
    for (size_t i = 0; i < keys.size(); ++i)
        EXPECT_EQ(serialize_hash_get_key(entry, static_cast<int32_t>(i)), keys[i]);
    EXPECT_STREQ(serialize_get_string(serialize_hash_get(entry, "serial")), "ABC123");
    EXPECT_STREQ(serialize_get_string(serialize_hash_get(entry, "name")), "Phone ABC123");
}

struct AuthRow {
    const char *what;
    int32_t protocol, iap2_authenticated, link_authenticated;
    int32_t authenticated;
};

const AuthRow kAuthRows[] = {
    {"iap2 takes its own state", 2, 1, 0, 1},
    {"iap2 not authenticated", 2, 0, 1, 0},
    {"iap1 takes the link state", 1, 0, 1, 1},
    {"iap1 not authenticated", 1, 1, 0, 0},
};

class Authentication : public testing::TestWithParam<AuthRow> {};

TEST_P(Authentication, ComesFromTheStateOfTheProtocol) {
    const AuthRow &row = GetParam();
    Registry reg;
    zal_attached_device d = make_device("S", ZAL_LINK_BLUETOOTH, 0);
    d.protocol = row.protocol;
    d.iap2_authenticated = row.iap2_authenticated;
    d.link_state = {row.link_authenticated, 0, 1};
    zal_device_registry_add(&reg.r, &d);
    GvalPtr list(get_current_devices(&reg.r));
    const gval *entry = serialize_array_get(list.get(), 0);
    EXPECT_EQ(int_at(entry, "authenticated"), row.authenticated);
    EXPECT_EQ(int_at(entry, "protocolinuse"), row.protocol);
    EXPECT_EQ(int_at(entry, "used"), 0);
    EXPECT_EQ(int_at(entry, "extended"), 1);
}

INSTANTIATE_TEST_SUITE_P(Rows, Authentication, testing::ValuesIn(kAuthRows),
                         [](const testing::TestParamInfo<AuthRow> &info) {
                             return "row" + std::to_string(info.index);
                         });

std::vector<std::string> serials(const gval *list) {
    std::vector<std::string> out;
    for (int i = 0; i < serialize_array_count(list); ++i)
        out.push_back(serialize_get_string(
            serialize_hash_get(serialize_array_get(list, static_cast<uint32_t>(i)), "serial")));
    return out;
}

TEST(DeviceRegistry, KeepsAttachOrderThroughRemovals) {
    Registry reg;
    for (const char *s : {"A", "B", "C", "D"}) {
        zal_attached_device d = make_device(s, ZAL_LINK_USB, 0);
        d.next = &d;  // ignored: the registry links its own copies
        ASSERT_NE(zal_device_registry_add(&reg.r, &d), nullptr);
    }
    EXPECT_EQ(reg.r.count, 4);
    EXPECT_EQ(zal_device_registry_remove(&reg.r, "A"), 1);  // head
    EXPECT_EQ(zal_device_registry_remove(&reg.r, "C"), 1);  // middle
    EXPECT_EQ(zal_device_registry_remove(&reg.r, "C"), 0);
    EXPECT_EQ(reg.r.count, 2);
    zal_attached_device e = make_device("E", ZAL_LINK_USB, 0);
    zal_device_registry_add(&reg.r, &e);
    ASSERT_NE(zal_device_registry_find(&reg.r, "D"), nullptr);
    EXPECT_EQ(zal_device_registry_find(&reg.r, "A"), nullptr);
    GvalPtr list(get_current_devices(&reg.r));
    EXPECT_EQ(serials(list.get()), (std::vector<std::string>{"B", "D", "E"}));
}

TEST(DeviceRegistry, EmptyOrNullRegistryGivesAnEmptyArray) {
    Registry reg;
    const zal_device_registry *registries[] = {&reg.r, nullptr};
    for (const zal_device_registry *r : registries) {
        GvalPtr list(get_current_devices(r));
        ASSERT_NE(list, nullptr);
        EXPECT_EQ(serialize_type(list.get()), SERIALIZE_ARRAY);
        EXPECT_EQ(serialize_array_count(list.get()), 0);
    }
}

TEST(DeviceRegistry, UnterminatedTextFromTheDaemonIsBounded) {
    Registry reg;
    zal_attached_device d = make_device("x", ZAL_LINK_USB, 0);
    std::memset(d.serial, 'S', sizeof d.serial);
    std::memset(d.name, 'N', sizeof d.name);
    zal_device_registry_add(&reg.r, &d);
    GvalPtr list(get_current_devices(&reg.r));
    const gval *entry = serialize_array_get(list.get(), 0);
    EXPECT_EQ(std::string(serialize_get_string(serialize_hash_get(entry, "serial"))),
              std::string(sizeof d.serial, 'S'));
    EXPECT_EQ(std::string(serialize_get_string(serialize_hash_get(entry, "name"))).size(),
              sizeof d.name - 1);
}

TEST(DeviceRegistry, HeaderWorksFromC) {
    EXPECT_EQ(devices_c_entry_count(), 2);
}

}  // namespace

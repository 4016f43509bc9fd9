// The daemon's registry of attached devices and the device list built from it.
#include <cstdlib>
#include <cstring>

#include "zal-ipod-2/daemon.h"

namespace {

// How a link is reported: its transport, and which of the link numbers go out (the
// others are reported as -1).
struct TransportRule {
    int32_t link_kind;
    bool usb_role;  // only for USB: the rule of the role flag set to 1
    int32_t transport;
    bool reports_usb;
    bool reports_rfcomm;
};

constexpr TransportRule kTransportRules[] = {
    {ZAL_LINK_BLUETOOTH, false, ZAL_TRANSPORT_BLUETOOTH, false, true},
    {ZAL_LINK_USB, true, ZAL_TRANSPORT_USB_ROLE, false, false},
    {ZAL_LINK_USB, false, ZAL_TRANSPORT_USB, true, false},
    {ZAL_LINK_OTHER, false, ZAL_TRANSPORT_OTHER, false, false},
};
constexpr TransportRule kUnknownLink = {0, false, ZAL_TRANSPORT_UNKNOWN, false, false};

const TransportRule &transport_rule(const zal_attached_device &device) {
    for (const TransportRule &rule : kTransportRules) {
        if (rule.link_kind != device.link_kind) continue;
        if (rule.link_kind == ZAL_LINK_USB && rule.usb_role != (device.usb_role == 1)) continue;
        return rule;
    }
    return kUnknownLink;
}

// Fixed arrays may come from a daemon that filled them without a terminator.
gval *bounded_string(const char *field, std::size_t size) {
    char copy[ZAL_DEVICE_NAME_SIZE];
    std::size_t n = strnlen(field, size < sizeof copy ? size : sizeof copy - 1);
    std::memcpy(copy, field, n);
    copy[n] = '\0';
    return serialize_string(copy);
}

// Adds every key; false when out of memory (the hash then holds what it took).
bool fill_entry(gval *entry, const zal_attached_device &device) {
    const TransportRule &rule = transport_rule(device);
    const zal_link_state &link = device.link_state;
    const struct {
        const char *key;
        gval *value;
    } fields[] = {
        {"serial", bounded_string(device.serial, sizeof device.serial)},
        {"name", bounded_string(device.name, sizeof device.name)},
        {"authenticated",
         serialize_int(device.protocol == 2 ? device.iap2_authenticated : link.authenticated)},
        {"used", serialize_int(link.used)},
        {"extended", serialize_int(link.extended)},
        {"protocolinuse", serialize_int(device.protocol)},
        {"transport", serialize_int(rule.transport)},
        {"bus", serialize_int(rule.reports_usb ? device.usb_bus : -1)},
        {"address", serialize_int(rule.reports_usb ? device.usb_address : -1)},
        {"rfcommId", serialize_int(rule.reports_rfcomm ? device.rfcomm_channel : -1)},
    };
    bool ok = true;
    // serialize_hash_add() takes (and on failure frees) every value, null ones refused.
    for (const auto &field : fields)
        if (field.value == nullptr || serialize_hash_add(entry, field.key, field.value) != 0)
            ok = false;
    return ok;
}

}  // namespace

extern "C" {

ZAL_API gval *get_current_devices(const zal_device_registry *registry) {
    gval *list = serialize_array();
    if (list == nullptr) return nullptr;
    for (const zal_attached_device *device = registry ? registry->head : nullptr; device != nullptr;
         device = device->next) {
        gval *entry = serialize_hash();
        if (entry != nullptr && !fill_entry(entry, *device)) {
            serialize_free(entry);
            entry = nullptr;
        }
        // serialize_array_add() frees the entry when it cannot take it.
        if (entry == nullptr || serialize_array_add(list, entry) != 0) {
            serialize_free(list);
            return nullptr;
        }
    }
    return list;
}

ZAL_API zal_attached_device *zal_device_registry_add(zal_device_registry *registry,
                                                     const zal_attached_device *device) {
    if (registry == nullptr || device == nullptr) return nullptr;
    auto *record = static_cast<zal_attached_device *>(std::malloc(sizeof(zal_attached_device)));
    if (record == nullptr) return nullptr;
    *record = *device;
    record->next = nullptr;
    zal_attached_device **tail = &registry->head;
    while (*tail != nullptr) tail = &(*tail)->next;
    *tail = record;
    ++registry->count;
    return record;
}

ZAL_API zal_attached_device *zal_device_registry_find(const zal_device_registry *registry,
                                                      const char *serial) {
    if (registry == nullptr || serial == nullptr) return nullptr;
    for (zal_attached_device *d = registry->head; d != nullptr; d = d->next)
        if (strncmp(d->serial, serial, sizeof d->serial) == 0) return d;
    return nullptr;
}

ZAL_API int zal_device_registry_remove(zal_device_registry *registry, const char *serial) {
    if (registry == nullptr || serial == nullptr) return 0;
    for (zal_attached_device **link = &registry->head; *link != nullptr; link = &(*link)->next) {
        zal_attached_device *d = *link;
        if (strncmp(d->serial, serial, sizeof d->serial) != 0) continue;
        *link = d->next;
        std::free(d);
        --registry->count;
        return 1;
    }
    return 0;
}

ZAL_API void zal_device_registry_clear(zal_device_registry *registry) {
    if (registry == nullptr) return;
    zal_attached_device *d = registry->head;
    while (d != nullptr) {
        zal_attached_device *next = d->next;
        std::free(d);
        d = next;
    }
    registry->head = nullptr;
    registry->count = 0;
}

}  // extern "C"

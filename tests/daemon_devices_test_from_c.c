/* The daemon headers compiled as C: a registry built and listed from C. */
#include <string.h>

#include "zal-ipod-2/daemon.h"
#include "zal-ipod-2/plugin.h"

int devices_c_entry_count(void);

int devices_c_entry_count(void) {
    zal_device_registry registry;
    zal_attached_device device;
    memset(&registry, 0, sizeof registry);
    memset(&device, 0, sizeof device);
    strcpy(device.serial, "c-one");
    device.link_kind = ZAL_LINK_BLUETOOTH;
    zal_device_registry_add(&registry, &device);
    strcpy(device.serial, "c-two");
    zal_device_registry_add(&registry, &device);
    gval *list = get_current_devices(&registry);
    int count = serialize_array_count(list);
    serialize_free(list);
    zal_device_registry_clear(&registry);
    return count;
}

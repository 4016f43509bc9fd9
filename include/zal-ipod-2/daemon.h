/**
 * @file
 * The daemon's side of the shared code: its context record with the command line that fills
 * it and the set_context_ setters, the registry of attached devices, and
 * get_current_devices(), which turns that registry into the device list that clients
 * receive.
 *
 * Only the daemon reads the context. It is written during start-up by one thread, before
 * the daemon starts its others, and carries no lock.
 *
 * Threads: nothing here locks or calls back. Call the setters during start-up, and the
 * registry functions from one thread at a time per registry (the daemon's own lock, if it
 * shares a registry between threads). get_current_devices() only reads the registry.
 */
#ifndef ZAL_IPOD_2_DAEMON_H
#define ZAL_IPOD_2_DAEMON_H

#include <stdint.h>

#include "plugin.h"
#include "serialize.h"
#include "zal_export.h"

ZAL_BEGIN_DECLS

/** Capacity of the context's device field, terminator included. */
#define ZAL_CONTEXT_DEVICE_SIZE 32
/** Capacity of the context's other text fields, terminator included. */
#define ZAL_CONTEXT_TEXT_SIZE 256

/** @name Defaults that parse_arguments() writes before it reads the options
 * @{ */
/** Default of the device field (-t). */
#define ZAL_CONTEXT_DEFAULT_DEVICE "general"
/** Default of the socket name (-u). */
#define ZAL_CONTEXT_DEFAULT_SOCKET_NAME "zal.ipod.IPodDaemon"
/** Default of the vehicle's engine type. */
#define ZAL_CONTEXT_DEFAULT_ENGINE_TYPE (-1)
/** @} */

/** One EAP protocol name; the list keeps command-line order. */
typedef struct eap_node {
    char *name;            /**< owned copy; null for the leading empty entry of ",a,b" */
    struct eap_node *next; /**< the following name, or null */
} eap_node;

/**
 * The daemon's configuration. The daemon zero-fills (or otherwise initialises) it before
 * parse_arguments(); fields that the command line does not reach keep what it put there.
 * Text fields always hold a NUL-terminated string.
 */
typedef struct zal_daemon_context {
    char device[ZAL_CONTEXT_DEVICE_SIZE];    /**< -t */
    char socket_name[ZAL_CONTEXT_TEXT_SIZE]; /**< -u: local socket that clients connect to */
    char config_path[ZAL_CONTEXT_TEXT_SIZE]; /**< -f */
    char bt_address[ZAL_CONTEXT_TEXT_SIZE];  /**< -b: the head unit's Bluetooth MAC as text */
    char bt_name[ZAL_CONTEXT_TEXT_SIZE];     /**< the adapter name, read after -b */
    eap_node *eap;                           /**< -e, owned */
    char *app_match_team_id;                 /**< -a, owned, 10 characters, or null */
    int32_t highest_protocol_mode;           /**< -i: 1 iAP1, 2 iAP2; at least 1 */
    char media_library_db_path[ZAL_CONTEXT_TEXT_SIZE]; /**< database of the media library plug-in */
    char artwork_path[ZAL_CONTEXT_TEXT_SIZE];          /**< folder that receives artwork */
    char vehicle_information_component_name[ZAL_CONTEXT_TEXT_SIZE]; /**< vehicle's name */
    int32_t vehicle_information_component_engine_type; /**< engine type code, -1 unknown */
    char vehicle_information_component_displayName[ZAL_CONTEXT_TEXT_SIZE]; /**< shown name */
    char accessory_wifi_ssid[ZAL_CONTEXT_TEXT_SIZE];       /**< head unit's Wi-Fi network */
    char accessory_wifi_passphrase[ZAL_CONTEXT_TEXT_SIZE]; /**< and its passphrase */
    ipod_usb_host_entry_points usb_host;                   /**< -l */
    ipod_media_library_entry_points media_library;         /**< -m */
    void *daemon_private[4]; /**< the daemon's own words; this code never touches them */
} context;

/**
 * Fills the defaults (device "general", socket "zal.ipod.IPodDaemon", empty config_path and
 * bt_address, engine type -1), then reads the options "hu:t:d:b:i:e:a:l:m:f:" with getopt()
 * in command-line order. Returns 0 when every option was taken, 1 after printing the usage
 * text (for -h, an unknown option, or an option that failed; options before a failed one
 * keep their effect, the rest are not read). Each call starts getopt() afresh from argv[1].
 *   -t device   -u socket   -f config file: copied, cut to the field's capacity.
 *   -d "stdout" or a path: the log stream _log_fp (common.h); a file is created or
 *      truncated. A file that cannot be opened is reported with a "CONFIG ERROR: " line and
 *      the stream falls back to standard output; parsing goes on.
 *   -b MAC or "localhost", -i, -e, -a, -l, -m: the setters below.
 */
ZAL_API int parse_arguments(int argc, char **argv, context *ctx);

/** Stores address as text (cut to 255 characters); "localhost" reads the address of the
 * adapter hci0 from sysfs instead. 1 on success, 0 (with two "CONFIG ERROR: " lines on
 * standard output) when that read fails. */
ZAL_API int set_context_bt_address(context *ctx, const char *address);
/** Reads the first word of the adapter hci0's name from sysfs into bt_name; 1 on success,
 * 0 (with a "CONFIG ERROR: " line, bt_name unchanged) on failure. */
ZAL_API int set_context_bt_name(context *ctx);
/** Replaces the EAP list by the comma-separated names of list, which is split in place.
 * A leading comma puts a null-named node first; empty pieces are skipped. Returns 1. */
ZAL_API int set_context_eap(context *ctx, char *list);
/** Takes an ID of exactly 10 characters (1), clears on an empty or null ID (1), refuses
 * any other length with an error record (0, ID cleared). */
ZAL_API int set_context_app_match_team_id(context *ctx, const char *id);
/** Decimal text; values below 1 (and text that is no number) store 1. 0 and no change for
 * null or empty text, else 1. */
ZAL_API int set_context_highest_protocol_mode(context *ctx, const char *text);
/** Decimal text; null or empty text changes nothing. */
ZAL_API void set_context_vehicle_information_component_engine_type(context *ctx, const char *text);
/** @name Text setters
 * @{ */
/** Copy text into the field of the same name. Text that does not fit the field with its
 * terminator (or null text) is refused: the field keeps its value and an error record
 * names the field. A cut path or passphrase would only fail later and less clearly. */
ZAL_API void set_context_media_library_db_path(context *ctx, const char *text);
ZAL_API void set_context_artwork_path(context *ctx, const char *text);
ZAL_API void set_context_vehicle_information_component_name(context *ctx, const char *text);
ZAL_API void set_context_vehicle_information_component_displayName(context *ctx, const char *text);
ZAL_API void set_context_accessory_wifi_ssid(context *ctx, const char *text);
ZAL_API void set_context_accessory_wifi_passphrase(context *ctx, const char *text);
/** @} */

/**
 * Loads the USB host plug-in at path, resolves its five entry points into ctx->usb_host and
 * runs ipod_platform_init() when present. 1: loaded and initialised; -1: its init failed,
 * or the library could not be loaded and the property "sys.usb.config" was switched to
 * "host"; 0: not loaded and the property already read "host" (the only failure for -l).
 */
ZAL_API int set_context_usb_host_plugin(context *ctx, const char *path);
/** Loads the media library plug-in at path and resolves its seventeen entry points into
 * ctx->media_library (nothing is called). 1 when loaded, 0 when not. */
ZAL_API int set_context_media_library_plugin(context *ctx, const char *path);
/** Kept for the daemon's configuration code; returns 1 and changes nothing. */
ZAL_API int set_context_cp_server(void);

/** Frees what the context owns (the EAP list and the team ID) and clears those fields.
 * Loaded plug-ins stay loaded. */
ZAL_API void zal_context_release(context *ctx);

/* ---- Attached devices ------------------------------------------------------------------ */

/** Link kinds of an attached device. */
enum {
    ZAL_LINK_USB = 1,
    ZAL_LINK_BLUETOOTH = 2,
    ZAL_LINK_OTHER = 4 /* the fourth kind of link (listed with transport 3) */
};

/** "transport" values of a device entry. */
enum {
    ZAL_TRANSPORT_UNKNOWN = -1,
    ZAL_TRANSPORT_USB = 0,      /**< USB, bus and address reported */
    ZAL_TRANSPORT_USB_ROLE = 1, /**< USB with the role flag set: bus and address not reported */
    ZAL_TRANSPORT_BLUETOOTH = 2,
    ZAL_TRANSPORT_OTHER = 3
};

/** Capacity of a device's serial, terminator included. */
#define ZAL_DEVICE_SERIAL_SIZE 64
/** Capacity of a device's name, terminator included. */
#define ZAL_DEVICE_NAME_SIZE 256

/** Authentication and mode of the link, as the iAP1 side of the daemon keeps them. */
typedef struct zal_link_state {
    int32_t authenticated; /**< 1 when authenticated */
    int32_t used;          /**< the daemon's in-use flag */
    int32_t extended;      /**< 1 in extended mode */
} zal_link_state;

/** One device the daemon knows. The registry links them in attach order. */
typedef struct zal_attached_device {
    struct zal_attached_device *next;    /**< the next device, or null */
    char serial[ZAL_DEVICE_SERIAL_SIZE]; /**< key by which events find the entry */
    char name[ZAL_DEVICE_NAME_SIZE];     /**< the name the device gives itself */
    int32_t protocol;                    /**< 1 iAP1, 2 iAP2 */
    int32_t iap2_authenticated;          /**< authentication state when protocol is 2 */
    zal_link_state link_state;           /**< authentication and mode (iAP1) */
    int32_t link_kind;                   /**< ZAL_LINK_ */
    int32_t usb_role;       /**< 1: the port is in the role where bus and address are not known */
    uint8_t usb_bus;        /**< USB bus number */
    uint8_t usb_address;    /**< USB device address on that bus */
    uint8_t rfcomm_channel; /**< RFCOMM channel of a Bluetooth link */
    void *daemon_data;      /**< the daemon's own; the registry neither reads nor frees it */
} zal_attached_device;

/** Head of the daemon's list of attached devices; zero-fill it to start empty. */
typedef struct zal_device_registry {
    zal_attached_device *head; /**< first device in attach order, or null */
    int32_t count;             /**< number of devices linked from head */
} zal_device_registry;

/** Appends a copy of device (its next pointer ignored) at the tail; returns the registry's
 * record, or null when out of memory or when an argument is null. */
ZAL_API zal_attached_device *zal_device_registry_add(zal_device_registry *registry,
                                                     const zal_attached_device *device);
/** The first record with this serial, or null. */
ZAL_API zal_attached_device *zal_device_registry_find(const zal_device_registry *registry,
                                                      const char *serial);
/** Unlinks and frees the first record with this serial; 1 when one was removed, else 0. */
ZAL_API int zal_device_registry_remove(zal_device_registry *registry, const char *serial);
/** Frees every record; the registry is empty afterwards. */
ZAL_API void zal_device_registry_clear(zal_device_registry *registry);

/**
 * The device list clients receive: a new array value (the caller frees it with
 * serialize_free) with one hash per record, in list order, holding "serial", "name",
 * "authenticated", "used", "extended", "protocolinuse", "transport", "bus", "address" and
 * "rfcommId". An empty or null registry gives an empty array; null when out of memory.
 */
ZAL_API gval *get_current_devices(const zal_device_registry *registry);

ZAL_END_DECLS

#endif /* ZAL_IPOD_2_DAEMON_H */

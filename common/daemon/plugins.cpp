// Loading the two plug-ins: entry points resolved by name into the context, the USB
// plug-in's initialisation at load, and the USB property fallback when it will not load.
#include <dlfcn.h>

#include <cstddef>
#include <cstdio>
#include <cstring>

#include "common/log.h"
#include "common/platform/properties.h"
#include "zal-ipod-2/daemon.h"

namespace {

// bionic on 32-bit ARM defines RTLD_NOW and RTLD_LOCAL as 0, so the daemon's historical
// dlopen(path, 0) meant "bind now, keep the symbols local". glibc refuses a mode of 0;
// spelling the two flags out behaves the same on both. A library that lacks a symbol it
// needs is refused at load instead of failing in the middle of a call.
constexpr int kPluginOpenMode = RTLD_NOW | RTLD_LOCAL;

struct EntryPoint {
    const char *symbol;
    std::size_t offset;  // of its slot in the entry point table
};

#define ZAL_USB_SLOT(member) \
    { #member, offsetof(ipod_usb_host_entry_points, member) }
constexpr EntryPoint kUsbHostEntryPoints[] = {
    ZAL_USB_SLOT(ipod_platform_init),          ZAL_USB_SLOT(ipod_is_host_mode_supported),
    ZAL_USB_SLOT(ipod_to_host_mode),           ZAL_USB_SLOT(ipod_to_device_mode),
    ZAL_USB_SLOT(ipod_is_host_mode_connected),
};
#undef ZAL_USB_SLOT

#define ZAL_MEDIA_SLOT(member) \
    { "ipod_media_library_" #member, offsetof(ipod_media_library_entry_points, member) }
constexpr EntryPoint kMediaLibraryEntryPoints[] = {
    ZAL_MEDIA_SLOT(get_media_library_last_known_revision),
    ZAL_MEDIA_SLOT(insert_media_library_if_not_exists),
    ZAL_MEDIA_SLOT(update_media_library_last_known_revision),
    ZAL_MEDIA_SLOT(insert_track),
    ZAL_MEDIA_SLOT(insert_playlist),
    ZAL_MEDIA_SLOT(insert_track_playlist),
    ZAL_MEDIA_SLOT(delete_media_item),
    ZAL_MEDIA_SLOT(delete_media_playlist),
    ZAL_MEDIA_SLOT(delete_media_tracks_playlist),
    ZAL_MEDIA_SLOT(get_items_current_category),
    ZAL_MEDIA_SLOT(get_collection_id),
    ZAL_MEDIA_SLOT(get_tracks_info_current_filter),
    ZAL_MEDIA_SLOT(reset_database_for_mlid),
    ZAL_MEDIA_SLOT(start_transaction),
    ZAL_MEDIA_SLOT(end_transaction),
    ZAL_MEDIA_SLOT(init),
    ZAL_MEDIA_SLOT(finish),
};
#undef ZAL_MEDIA_SLOT

// Every slot is one function pointer, so the tables cover their records exactly.
static_assert(sizeof(void *) == sizeof(ipod_platform_init_fn *));
static_assert(sizeof kUsbHostEntryPoints / sizeof(EntryPoint) * sizeof(void *) ==
              sizeof(ipod_usb_host_entry_points));
static_assert(sizeof kMediaLibraryEntryPoints / sizeof(EntryPoint) * sizeof(void *) ==
              sizeof(ipod_media_library_entry_points));

// Resolves each symbol in table order and stores it (null when missing) in its slot.
// POSIX guarantees that a dlsym() result converts to a function pointer of the same size.
template <std::size_t N>
void resolve(void *library, const EntryPoint (&table)[N], void *record) {
    for (const EntryPoint &entry : table) {
        void *symbol = dlsym(library, entry.symbol);
        std::memcpy(static_cast<unsigned char *>(record) + entry.offset, &symbol, sizeof symbol);
    }
}

// A null path would make dlopen() hand back the program itself.
void *open_plugin(const char *path) {
    if (path == nullptr || path[0] == '\0') return nullptr;
    return dlopen(path, kPluginOpenMode);
}

constexpr const char *kUsbConfigProperty = "sys.usb.config";

}  // namespace

extern "C" {

// The library is never closed: its functions stay in the context for the process's life.
ZAL_API int set_context_usb_host_plugin(context *ctx, const char *path) {
    if (ctx == nullptr) return 0;
    void *library = open_plugin(path);
    if (library != nullptr) {
        resolve(library, kUsbHostEntryPoints, &ctx->usb_host);
        if (ctx->usb_host.ipod_platform_init != nullptr && ctx->usb_host.ipod_platform_init() < 0) {
            std::printf("CONFIG ERROR: USB init mode is not host mode \n");
            return -1;
        }
        return 1;
    }

    ZAL_LOGE("CONFIG ERROR: Unable to load USB host plugin library. from %s \n\n",
             path ? path : "(null)");
    // Without a plug-in, put the port in host mode through the platform and stop the
    // service that would otherwise claim it.
    char mode[kPlatformPropertyValueMax];
    platform_property_get(kUsbConfigProperty, mode, "");
    if (std::strcmp(mode, "host") == 0) return 0;
    platform_property_set(kUsbConfigProperty, "host");
    platform_property_set("ctl.stop", "mdnsd_carplay");
    return -1;
}

ZAL_API int set_context_media_library_plugin(context *ctx, const char *path) {
    if (ctx == nullptr) return 0;
    void *library = open_plugin(path);
    if (library == nullptr) {
        const char *reason = path == nullptr || path[0] == '\0' ? "no library path" : dlerror();
        std::printf("CONFIG ERROR: Unable to load media library plugin. Error: %s\n\n",
                    reason ? reason : "unknown");
        return 0;
    }
    resolve(library, kMediaLibraryEntryPoints, &ctx->media_library);
    return 1;
}

}  // extern "C"

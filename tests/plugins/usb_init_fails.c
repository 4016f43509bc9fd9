/* USB host plug-in whose initialisation reports that host mode is not possible. */
#include "zal-ipod-2/plugin.h"

ZAL_PLUGIN_EXPORT int ipod_platform_init(void) {
    return -5;
}
ZAL_PLUGIN_EXPORT int ipod_to_host_mode(void) {
    return 0;
}

/* USB host plug-in that defines only the switch to host mode. */
#include "zal-ipod-2/plugin.h"

ZAL_PLUGIN_EXPORT int ipod_to_host_mode(void) {
    return 0;
}

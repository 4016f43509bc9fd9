// The head unit's Bluetooth identity: the address given on the command line or read from
// the adapter hci0 in sysfs, and the adapter's name.
#include <climits>
#include <cstdio>
#include <cstring>

#include "common/daemon/context_internal.h"
#include "zal-ipod-2/daemon.h"

namespace {

constexpr const char *kAddressFile = "/sys/class/bluetooth/hci0/address";
constexpr const char *kNameFile = "/sys/class/bluetooth/hci0/name";

// Set once by tests before any read; the daemon never changes it.
char sysfs_root[PATH_MAX] = "";

// Reads the file's first whitespace-delimited word into field (256 bytes), cut to 255
// characters; false when the file cannot be opened or holds no word.
bool read_first_word(const char *absolute_path, char *field) {
    char path[PATH_MAX];
    if (!zal::daemon::sysfs_path(absolute_path, path, sizeof path)) return false;
    FILE *f = std::fopen(path, "rt");
    if (f == nullptr) return false;
    static_assert(ZAL_CONTEXT_TEXT_SIZE == 256, "the width in the format below");
    char word[ZAL_CONTEXT_TEXT_SIZE];
    bool ok = std::fscanf(f, "%255s", word) == 1;
    std::fclose(f);
    if (ok) std::memcpy(field, word, std::strlen(word) + 1);
    return ok;
}

}  // namespace

namespace zal::daemon {

void set_sysfs_root(const char *root) {
    copy_cut(sysfs_root, sizeof sysfs_root, root ? root : "");
}

bool sysfs_path(const char *absolute_path, char *out, std::size_t size) {
    int n = std::snprintf(out, size, "%s%s", sysfs_root, absolute_path);
    return n >= 0 && static_cast<std::size_t>(n) < size;
}

}  // namespace zal::daemon

extern "C" {

ZAL_API int set_context_bt_address(context *ctx, const char *address) {
    if (ctx == nullptr || address == nullptr) return 0;
    if (std::strcmp(address, "localhost") != 0) {
        zal::daemon::copy_cut(ctx->bt_address, sizeof ctx->bt_address, address);
        return 1;
    }
    if (read_first_word(kAddressFile, ctx->bt_address)) return 1;
    std::printf("CONFIG ERROR: Unable to read BlueTooth hci0 MAC address from %s\n", kAddressFile);
    std::printf("CONFIG ERROR: Please provide BlueTooth MAC address in hex format\n");
    return 0;
}

ZAL_API int set_context_bt_name(context *ctx) {
    if (ctx != nullptr && read_first_word(kNameFile, ctx->bt_name)) {
        std::printf("\n ######### NAME : %s \n", ctx->bt_name);
        return 1;
    }
    std::printf("CONFIG ERROR: Unable to read BlueTooth hci0 name from %s \n", kNameFile);
    return 0;
}

}  // extern "C"

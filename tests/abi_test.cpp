// The binary interface: headers usable from C, only C API names exported by the shared
// library, and the library loadable by path.
#include <dlfcn.h>
#include <gtest/gtest.h>

#include <cstdio>
#include <regex>
#include <string>
#include <vector>

#include "zal-ipod-2/common.h"
#include "zal-ipod-2/serialize.h"

extern "C" int abi_c_round_trip(void);
extern "C" const char *abi_c_opcode_name(void);

namespace {

TEST(Abi, HeadersWorkFromC) {
    EXPECT_EQ(abi_c_round_trip(), 1);
    EXPECT_STREQ(abi_c_opcode_name(), "KEEP_ALIVE");
}

std::vector<std::string> exported_symbols() {
    std::string command =
        std::string(ZAL_NM_PROGRAM) + " -D --defined-only '" + ZAL_SHARED_LIBRARY_PATH + "'";
    std::vector<std::string> names;
    FILE *p = popen(command.c_str(), "r");
    if (p == nullptr) return names;
    char line[1024];
    while (fgets(line, sizeof line, p) != nullptr) {
        // "<address> <type> <name>[@@version]"
        std::string s(line);
        while (!s.empty() && (s.back() == '\n' || s.back() == '\r')) s.pop_back();
        size_t space = s.rfind(' ');
        std::string name = space == std::string::npos ? s : s.substr(space + 1);
        size_t at = name.find('@');
        if (at != std::string::npos) name.resize(at);
        if (!name.empty()) names.push_back(name);
    }
    EXPECT_EQ(pclose(p), 0) << command;
    return names;
}

TEST(Abi, SharedLibraryExportsOnlyTheCApi) {
    const std::regex api(
        "zal_.*|_zal_ipod_.*|serialize.*|unserialize|print_hex|parse_arguments|set_context_.*|common_init|"
        "common_log_init|_log_fp|print_time_stamp|get_function_string|get_event_string|"
        "get_device_event_string|get_current_devices|get_next_id|getVersionLevel[012]|"
        "getReleaseVersion");
    std::vector<std::string> names = exported_symbols();
    ASSERT_GT(names.size(), 50u);
    for (const std::string &name : names) {
        EXPECT_NE(name.rfind("_Z", 0), 0u) << "C++ symbol exported: " << name;
        EXPECT_TRUE(std::regex_match(name, api)) << "unexpected export: " << name;
    }
    for (const char *wanted : {"unserialize", "_log_fp", "get_function_string", "print_hex"})
        EXPECT_NE(std::find(names.begin(), names.end(), wanted), names.end()) << wanted;
}

TEST(Abi, LibraryLoadsByPathAndResolvesItsApi) {
    void *lib = dlopen(ZAL_SHARED_LIBRARY_PATH, RTLD_NOW | RTLD_LOCAL);
    ASSERT_NE(lib, nullptr) << dlerror();
    auto name_of = reinterpret_cast<const char *(*)(uint32_t)>(dlsym(lib, "get_function_string"));
    auto log_init = reinterpret_cast<FILE **(*)()>(dlsym(lib, "common_log_init"));
    auto make_int = reinterpret_cast<gval *(*)(int32_t)>(dlsym(lib, "serialize_int"));
    auto encode =
        reinterpret_cast<unsigned char *(*)(const gval *, uint32_t *)>(dlsym(lib, "serialize"));
    auto release = reinterpret_cast<void (*)(gval *)>(dlsym(lib, "serialize_free"));
    auto log_fp = static_cast<FILE **>(dlsym(lib, "_log_fp"));
    ASSERT_TRUE(name_of && log_init && make_int && encode && release && log_fp);
    EXPECT_EQ(dlsym(lib, "value_new_blob"), nullptr);  // internal helpers stay hidden

    EXPECT_STREQ(name_of(132), "GET_CONFIG");
    EXPECT_EQ(log_init(), log_fp);
    EXPECT_EQ(*log_fp, stdout);
    gval *v = make_int(-2);
    uint32_t len = 0;
    unsigned char *buf = encode(v, &len);
    ASSERT_EQ(len, 6u);
    EXPECT_EQ(buf[5], 0xFE);
    free(buf);
    release(v);
    dlclose(lib);
}

}  // namespace

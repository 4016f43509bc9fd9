// The binary interface: headers usable from C, exactly the recorded C API exported by the
// shared library, that record equal to the headers' declarations, and the library loadable
// by path.
#include <dlfcn.h>
#include <sys/stat.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <set>
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

// Lines a command prints, trailing newlines removed; the command must succeed.
std::vector<std::string> command_lines(const std::string &command) {
    std::vector<std::string> lines;
    FILE *p = popen(command.c_str(), "r");
    if (p == nullptr) {
        ADD_FAILURE() << "cannot run: " << command;
        return lines;
    }
    char line[1024];
    while (fgets(line, sizeof line, p) != nullptr) {
        std::string s(line);
        while (!s.empty() && (s.back() == '\n' || s.back() == '\r')) s.pop_back();
        lines.push_back(s);
    }
    EXPECT_EQ(pclose(p), 0) << command;
    return lines;
}

// What the shared library defines in its dynamic symbol table.
std::set<std::string> exported_symbols() {
    std::set<std::string> names;
    std::string command =
        std::string(ZAL_NM_PROGRAM) + " -D --defined-only '" + ZAL_SHARED_LIBRARY_PATH + "'";
    for (const std::string &line : command_lines(command)) {
        // "<address> <type> <name>[@@version]"
        size_t space = line.rfind(' ');
        std::string name = space == std::string::npos ? line : line.substr(space + 1);
        size_t at = name.find('@');
        if (at != std::string::npos) name.resize(at);
        if (!name.empty()) names.insert(name);
    }
    return names;
}

// The names the version script lists between "global:" and "local:".
std::set<std::string> recorded_exports() {
    std::set<std::string> names;
    std::ifstream map(ZAL_EXPORT_MAP_PATH);
    EXPECT_TRUE(map.is_open()) << ZAL_EXPORT_MAP_PATH;
    const std::regex entry(R"(\s*([A-Za-z_][A-Za-z0-9_]*)\s*;\s*)");
    bool in_global = false;
    std::string line;
    std::smatch m;
    while (std::getline(map, line)) {
        if (line.find("global:") != std::string::npos)
            in_global = true;
        else if (line.find("local:") != std::string::npos)
            in_global = false;
        else if (in_global && std::regex_match(line, m, entry))
            names.insert(m[1]);
    }
    return names;
}

// The names that scripts/update-exports finds declared with ZAL_API, in the public headers
// or, given include_dir, in <include_dir>/zal-ipod-2/*.h.
std::set<std::string> declared_exports(const std::string &include_dir = "") {
    std::string command = std::string("CC='") + ZAL_C_COMPILER + "' ";
    if (!include_dir.empty()) command += "ZAL_EXPORTS_INCLUDE='" + include_dir + "' ";
    command += std::string("'") + ZAL_UPDATE_EXPORTS + "' --list";
    std::vector<std::string> lines = command_lines(command);
    return {lines.begin(), lines.end()};
}

std::vector<std::string> minus(const std::set<std::string> &a, const std::set<std::string> &b) {
    std::vector<std::string> out;
    std::set_difference(a.begin(), a.end(), b.begin(), b.end(), std::back_inserter(out));
    return out;
}

// The library exports the recorded list, no more and no less: an internal function cannot
// leak out, and a declared function without a definition (or a dropped one) shows up.
TEST(Abi, SharedLibraryExportsExactlyTheRecordedList) {
    std::set<std::string> exported = exported_symbols();
    std::set<std::string> recorded = recorded_exports();
    ASSERT_GT(recorded.size(), 200u) << "the map's list was not read";
    for (const char *wanted : {"unserialize", "_log_fp", "get_function_string", "zal_ipod_connect"})
        EXPECT_EQ(recorded.count(wanted), 1u) << wanted;
    for (const std::string &name : minus(exported, recorded))
        ADD_FAILURE() << "exported but not listed in cmake/libzal-ipod-2.map: " << name;
    for (const std::string &name : minus(recorded, exported))
        ADD_FAILURE() << "listed in cmake/libzal-ipod-2.map but not exported (declared and "
                         "never defined?): "
                      << name;
}

// The recorded list is the headers' ZAL_API declarations.
TEST(Abi, RecordedListIsWhatTheHeadersDeclare) {
    std::set<std::string> declared = declared_exports();
    std::set<std::string> recorded = recorded_exports();
    ASSERT_FALSE(declared.empty()) << "scripts/update-exports --list printed nothing";
    for (const std::string &name : minus(declared, recorded))
        ADD_FAILURE() << name << " is declared ZAL_API but missing from cmake/libzal-ipod-2.map: "
                      << "run scripts/update-exports";
    for (const std::string &name : minus(recorded, declared))
        ADD_FAILURE() << name << " is in cmake/libzal-ipod-2.map but no public header declares "
                      << "it ZAL_API: run scripts/update-exports";
}

// The lister reads declarations as the compiler does: whatever their layout, through the
// macros that declare them, and only those marked ZAL_API.
TEST(Abi, ExportListerFindsEveryShapeOfDeclaration) {
    char dir_template[] = "/tmp/zal-abi-XXXXXX";
    ASSERT_NE(mkdtemp(dir_template), nullptr);
    const std::string dir = dir_template;
    ASSERT_EQ(mkdir((dir + "/zal-ipod-2").c_str(), 0700), 0);
    {
        std::ifstream real(std::string(ZAL_PUBLIC_INCLUDE_DIR) + "/zal-ipod-2/zal_export.h");
        std::ofstream copy(dir + "/zal-ipod-2/zal_export.h");
        copy << real.rdbuf();
    }
    std::ofstream(dir + "/zal-ipod-2/shapes.h") << R"(
#include <stdint.h>
#include "zal_export.h"
#define ZAL_PLUGIN_EXPORT __attribute__((visibility("default")))
#define PAIR(name) ZAL_API int pair_##name(void); ZAL_API int pair_##name##_sync(void);
ZAL_BEGIN_DECLS
ZAL_API int plain(void);
ZAL_API const char *const *
    pointer_result_over_lines(const char *a,
                              int (*callback)(int, void *));
ZAL_API void with_printf_check(const char *fmt, ...) ZAL_PRINTF(1, 2);
ZAL_PRINTF(1, 2) ZAL_API int attribute_first(const char *fmt, ...);
extern ZAL_API int data_symbol;
extern ZAL_API char data_array[16];
typedef int callback_fn(void);
ZAL_API callback_fn through_typedef;
PAIR(made)
ZAL_PLUGIN_EXPORT int plugin_entry_point(void);
int not_exported(void);
/* ZAL_API int commented_out(void); */
#if 0
ZAL_API int compiled_out(void);
#endif
ZAL_END_DECLS
)";
    std::set<std::string> expected = {"attribute_first",
                                      "data_array",
                                      "data_symbol",
                                      "pair_made",
                                      "pair_made_sync",
                                      "plain",
                                      "pointer_result_over_lines",
                                      "through_typedef",
                                      "with_printf_check"};
    EXPECT_EQ(declared_exports(dir), expected);
    std::filesystem::remove_all(dir);
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

// The configuration client: what its file may hold, what is refused and where, searches, and decoded values.
#include "libraries/libcfg/cfg.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <memory>
#include <string>
#include <string_view>
#include <tuple>
#include <vector>

#include "libraries/libpwd/pwd_format.h"
#include "tests/support/message_catcher.h"
#include "tests/support/temp_dir.h"

using namespace std::string_literals;
using test_support::debug_catcher;
using test_support::temp_dir;

namespace {

using handle = std::unique_ptr<cfg_handle, decltype(&cfg_unbind)>;

handle open_file(const std::string& path)
{
    handle cfg(cfg_init(nullptr, 0), cfg_unbind);
    EXPECT_EQ(cfg_set_option(cfg.get(), CFG_OPT_FILE, path.c_str()), 0);
    return cfg;
}

int bind_to(const handle& cfg)
{
    return cfg_bind_s(cfg.get(), nullptr, nullptr, CFG_AUTH_SIMPLE);
}

std::string take(char* text)
{
    const std::unique_ptr<char, decltype(&cfg_memfree)> guard(text, cfg_memfree);
    return text == nullptr ? "(null)" : text;
}

// The entry as "dn{name=value|value;name=value;}".
std::string text_of(cfg_handle* cfg, cfg_message* entry)
{
    std::string text = take(cfg_get_dn(cfg, entry)) + "{";
    cfg_ber* cursor = nullptr;
    for (char* at = cfg_first_attribute(cfg, entry, &cursor); at != nullptr;) {
        const std::string name = take(at);
        const std::unique_ptr<char*, decltype(&cfg_value_free)> values(cfg_get_values(cfg, entry, name.c_str()),
                                                                       cfg_value_free);
        text += name;
        for (char** value = values.get(); *value != nullptr; ++value) {
            text += (value == values.get() ? "=" : "|") + std::string(*value);
        }
        text += ";";
        at = cfg_next_attribute(cfg, entry, cursor);
        EXPECT_EQ(cfg_get_errno(cfg), 0);
    }
    cfg_ber_free(cursor);
    return text + "}";
}

// What a search finds, as texts or as names only; or the code of its failure.
std::string found(const handle& cfg, const char* base, int scope, const char* filter, bool names_only)
{
    cfg_message* result = nullptr;
    const int code = cfg_search_s(cfg.get(), base, scope, filter, nullptr, 0, &result);
    EXPECT_EQ(code, cfg_get_errno(cfg.get()));
    if (code != 0) {
        EXPECT_EQ(result, nullptr);
        return std::to_string(code);
    }
    std::string text;
    int count = 0;
    for (cfg_message* at = cfg_first_entry(cfg.get(), result); at != nullptr; at = cfg_next_entry(cfg.get(), at)) {
        text += names_only ? take(cfg_get_dn(cfg.get(), at)) + " " : text_of(cfg.get(), at);
        ++count;
    }
    EXPECT_EQ(cfg_count_entries(cfg.get(), result), count);
    cfg_msgfree(result);
    return text;
}

TEST(CfgFile, LinesBecomeEntries)
{
    const temp_dir folder;
    const std::pair<std::string, const char*> table[] = {
        {"", ""},
        {"\n\n# only\n  a comment\n", ""},
        {"dn: cn=a", "cn=a{}"},
        {"dn: cn=a\ncn:   x y \nCN:z\nsn:\ncn: x y ", "cn=a{cn=x y |z|x y ;sn=;}"},
        {"DN:: Y249YQ==\r\ncn:: IHgKeQ==\r\nsn:\r\n", "cn=a{cn= x\ny;sn=;}"},
        {"dn: c\n n=\n a\n#note\n cn: no\ncn: x\n  y\r\n z\n \ncn:: e\n Q=\n =\n", "cn=a{cn=x yz|y;}"},
        {"dn: cn=b\n\n\ndn: CN = c , Cn=\"a,b\"\n\r\n#x\ndn: cn=\\,,cn=b\n",
         "CN = c , Cn=\"a,b\"{}cn=b{}cn=\\,,cn=b{}"},
        {"dn: cn=a\ncn: " + std::string(1 << 20, 'x'), nullptr},
    };
    for (const auto& [text, expected] : table) {
        const handle cfg = open_file(folder.write("conf", text));
        EXPECT_EQ(bind_to(cfg), 0) << text.substr(0, 80);
        const std::string got = found(cfg, "", CFG_SCOPE_SUB, "objectclass=*", false);
        EXPECT_EQ(got, expected != nullptr ? expected : "cn=a{cn=" + text.substr(13) + ";}");
    }
}

TEST(CfgFile, WhatIsRefusedIsNamedByReasonLineAndFile)
{
    const temp_dir folder;
    const std::tuple<std::string, int, int, const char*> table[] = {
        {"dn: cn=a\n\ncn: x\n", 84, 3, "an entry without dn"},
        {"dn: cn=a\ncn: x\nDn: cn=b\n", 84, 3, "a second dn in one entry"},
        {"dn: cn=a\n\n cn: x\n", 84, 3, "a continuation of no line"},
        {"dn: cn=a\ncn: x\n y\ncn", 84, 4, "a line without a colon"},
        {"dn: cn=a\nc n: x", 84, 2, "a malformed attribute name"},
        {"dn: cn=a\ncn:< /etc/passwd", 84, 2, "a value in another file"},
        {"dn: cn=a\ncn: x\0y"s, 84, 2, "a value with a zero byte"},
        {"dn: cn=a\ncn:: AA==", 84, 2, "a value with a zero byte"},
        {"dn: cn=a\ncn:: QR==", 84, 2, "malformed base64"},
        {"dn: cn=a\ncn:: QUI", 84, 2, "malformed base64"},
        {"dn: cn=a\ncn:: QU B", 84, 2, "malformed base64"},
        {"dn:", 34, 1, "a malformed dn"},
        {"dn: cn", 34, 1, "a malformed dn"},
        {"dn: cn=a,,cn=b", 34, 1, "a malformed dn"},
        {"dn: cn=\"a", 34, 1, "a malformed dn"},
        {"dn: cn=a\\", 34, 1, "a malformed dn"},
        {"dn: =a", 34, 1, "a malformed dn"},
        {"dn: c\\n=a", 34, 1, "a malformed dn"},
        {"dn: cn=a,\"cn\"=b", 34, 1, "a malformed dn"},
        {"dn: cn=a\n\n\ndn: CN = A\n", 68, 4, "a second entry of that dn"},
    };
    for (const auto& [text, code, line, reason] : table) {
        const debug_catcher log;
        const std::string file = folder.write("conf", text);
        const handle cfg = open_file(file);
        EXPECT_EQ(bind_to(cfg), code) << text;
        cfg_dump_exception(cfg.get());  // switched off
        cfg_perror(cfg.get(), "step");
        const std::string place = " in line " + std::to_string(line) + " of file " + file;
        EXPECT_EQ(cfg_set_option(cfg.get(), CFG_OPT_DUMP, CFG_OPT_ON), 0);  // once it has failed
        EXPECT_EQ(cfg_set_option(cfg.get(), CFG_OPT_DUMP_PLACE, CFG_OPT_ON), 0);
        cfg_dump_exception(cfg.get());
        const std::string told = ": "s + reason + place + ", rc=" + std::to_string(code) + "\n";
        EXPECT_EQ(log.texts(), (std::vector{"Error - step" + told, "Error - cfg_dump_exception" + told}));
        EXPECT_EQ(found(cfg, "", CFG_SCOPE_SUB, "objectclass=*", true), "1") << "nothing is bound";
    }
}

TEST(CfgFile, AnUnreadableFileAndWhatNoFileHasAreRefused)
{
    const temp_dir folder;
    ASSERT_EQ(mkfifo(folder.path("pipe").c_str(), 0600), 0);
    for (const std::string& path : {folder.path("missing"), folder.path(), folder.path("pipe")}) {
        const debug_catcher log;
        const handle cfg = open_file(path);
        cfg_set_option(cfg.get(), CFG_OPT_DUMP, CFG_OPT_ON);
        cfg_set_option(cfg.get(), CFG_OPT_DUMP_PLACE, CFG_OPT_ON);
        EXPECT_EQ(bind_to(cfg), 82) << path;
        cfg_dump_exception(cfg.get());
        EXPECT_TRUE(log.count() == 1 && log.texts()[0].ends_with(", file " + path + ", rc=82\n")) << log.texts()[0];
    }
    for (const auto& [size, code] : {std::pair(16 << 20, 84), {(16 << 20) + 1, 82}}) {  // zeros, and too many
        const std::string path = folder.write("long", "");
        std::filesystem::resize_file(path, static_cast<std::uintmax_t>(size));
        EXPECT_EQ(bind_to(open_file(path)), code);
    }
    EXPECT_TRUE(cfg_init("localhost", 0) == nullptr && cfg_init(nullptr, 389) == nullptr);
    const handle cfg(cfg_init("", 0), cfg_unbind);
    EXPECT_TRUE(bind_to(cfg) == 89 && cfg_set_option(cfg.get(), CFG_OPT_FILE, "") == 89);
    EXPECT_TRUE(cfg_set_option(cfg.get(), 0x3eb, CFG_OPT_ON) == 89 && cfg_get_errno(cfg.get()) == 89);
    EXPECT_TRUE(cfg_bind_s(cfg.get(), nullptr, nullptr, 0) == 7 && cfg_bind_s(cfg.get(), "x", nullptr, 0x80) == 48);
    cfg_message* result = nullptr;
    EXPECT_EQ(cfg_search_s(cfg.get(), "", 0, "cn=*", nullptr, 1, &result), 92);
    EXPECT_TRUE(cfg_first_entry(cfg.get(), nullptr) == nullptr && cfg_count_entries(cfg.get(), nullptr) == -1);
    cfg_ber* cursor = nullptr;
    EXPECT_TRUE(cfg_first_attribute(cfg.get(), nullptr, &cursor) == nullptr && cfg_get_errno(cfg.get()) == 89);
    EXPECT_TRUE(cfg_bind_s(nullptr, nullptr, nullptr, 0x80) == 89 && cfg_get_errno(nullptr) == 89);
}

TEST(CfgSearch, ScopesAndFiltersChooseTheEntries)
{
    const temp_dir folder;
    const handle cfg = open_file(folder.write(
        "conf", "dn: cn=x,o=b\nsn: One*\n\ndn: o=b\nobjectClass: top\n\ndn: cn=\"y,o=b\"\nsn: two\n\ndn: cn=z\\,o=b\n\n"
                "dn: cn=u, cn=v , o=B\nSN: one*\nsn: two\n\ndn: cn=xx,o=b\n\ndn: cn=x+sn=y,o=b\n"));
    ASSERT_EQ(bind_to(cfg), 0);
    const std::tuple<const char*, int, const char*, const char*> table[] = {
        {" O = B ", CFG_SCOPE_BASE, "(objectclass=*)", "o=b "},
        {"o=b", CFG_SCOPE_ONE, "objectclass=*", "cn=x,o=b cn=x+sn=y,o=b cn=xx,o=b "},
        {"o=b", CFG_SCOPE_SUB, "objectclass=*", "o=b cn=u, cn=v , o=B cn=x,o=b cn=x+sn=y,o=b cn=xx,o=b "},
        {"cn=X ; o=b", CFG_SCOPE_SUB, "objectclass=*", "cn=x,o=b "},
        {"", CFG_SCOPE_ONE, "objectclass=*", "cn=\"y,o=b\" cn=z\\,o=b o=b "},
        {"", CFG_SCOPE_BASE, "objectclass=*", "32"},
        {"cn=v,o=b", CFG_SCOPE_SUB, "objectclass=*", "32"},
        {"cn=\"x\",o=b", CFG_SCOPE_SUB, "objectclass=*", "32"},  // other names than cn=x
        {"cn=\\78,o=b", CFG_SCOPE_SUB, "objectclass=*", "32"},
        {"sn=y+cn=x,o=b", CFG_SCOPE_SUB, "objectclass=*", "32"},
        {"", CFG_SCOPE_SUB, "Sn=*", "cn=\"y,o=b\" cn=u, cn=v , o=B cn=x,o=b "},
        {"", CFG_SCOPE_SUB, "(sn=ONE\\2a)", "cn=u, cn=v , o=B cn=x,o=b "},
        {"", CFG_SCOPE_SUB, "(sn=one)", ""},
        {"", CFG_SCOPE_SUB, "objectclass=TOP", "o=b "},
        {"b", CFG_SCOPE_SUB, "sn=*", "34"},
        {"", 3, "sn=*", "89"},
        {"", CFG_SCOPE_SUB, nullptr, "89"},
        {"", CFG_SCOPE_SUB, "sn=one*", "87"},
        {"", CFG_SCOPE_SUB, "(&(sn=a)(cn=b))", "87"},
        {"", CFG_SCOPE_SUB, "sn>=a", "87"},
        {"", CFG_SCOPE_SUB, "sn=\\2", "87"},
        {"", CFG_SCOPE_SUB, "sn", "87"},
        {"", CFG_SCOPE_SUB, "(", "87"},
    };
    for (const auto& [base, scope, filter, expected] : table) {
        EXPECT_EQ(found(cfg, base, scope, filter, true), expected) << base << " " << (filter == nullptr ? "" : filter);
    }
}

TEST(CfgValues, AKeyDecodesWhatItEncodedAndAResultOutlivesItsSession)
{
    const temp_dir folder;
    aes_key_data key = {32, "the key of the server", "salt"};
    char coded[200];
    const unsigned long length = format_password(PWD_AES256, nullptr, &key, "secret", 6, coded, sizeof coded);
    handle cfg = open_file(folder.write("conf", "dn: cn=a\npw: " + std::string(coded, length) +
                                                    "\npw: {SHA}x\n\ndn: cn=b\npw: {aes256}damaged\ncn: b\n"));
    ASSERT_EQ(bind_to(cfg), 0);
    EXPECT_EQ(found(cfg, "cn=a", 0, "pw=*", false), "cn=a{pw=" + std::string(coded, length) + "|{SHA}x;}");
    EXPECT_EQ(cfg_set_option(cfg.get(), CFG_OPT_KEY, &key), 0);
    key.key[0] ^= 1;  // the handle has its own
    EXPECT_EQ(found(cfg, "cn=a", 0, "pw=*", false), "cn=a{pw=secret|{SHA}x;}");
    EXPECT_EQ(found(cfg, "cn=a", 0, "pw=secret", false), "");

    cfg_message* result = nullptr;
    ASSERT_EQ(cfg_search_s(cfg.get(), "cn=b", 0, "cn=*", nullptr, 0, &result), 0);
    EXPECT_TRUE(cfg_get_values(cfg.get(), result, "PW") == nullptr && cfg_get_errno(cfg.get()) == 84);
    EXPECT_TRUE(cfg_get_values(cfg.get(), result, "sn") == nullptr && cfg_get_errno(cfg.get()) == 16);
    EXPECT_TRUE(cfg_first_entry(nullptr, result) == nullptr && cfg_count_entries(nullptr, result) == -1);
    EXPECT_EQ(cfg_set_option(cfg.get(), CFG_OPT_FILE, folder.write("other", "x").c_str()), 0);
    EXPECT_EQ(bind_to(cfg), 84);
    cfg = handle(cfg_init(nullptr, 0), cfg_unbind);
    EXPECT_EQ(text_of(cfg.get(), result), "cn=b{pw={aes256}damaged;cn=b;}");
    cfg_msgfree(result);
}

#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // the heap isn't where it is looked for

// The program's heap, as far as it has come to it.
std::string_view heap()
{
    std::ifstream maps("/proc/self/maps");
    for (std::string line; std::getline(maps, line);) {
        std::size_t at = 0;
        if (line.ends_with("[heap]")) {
            const std::size_t start = std::stoul(line, &at, 16);
            return {reinterpret_cast<const char*>(start), std::stoul(line.substr(at + 1), nullptr, 16) - start};
        }
    }
    return {};
}

TEST(CfgValues, NothingIsLeftOfThemInMemory)
{
    const temp_dir folder;
    std::array<char, 64> line = {};  // on the stack, and of a word that stands in no other place
    for (std::size_t i = 0; i < line.size(); ++i) {
        line[i] = i < 16 ? "dn: cn=a\ncn: yz\n"[i] : i < 20 ? "pw: "[i - 16] : static_cast<char>('A' + i * 7 % 26);
    }
    const std::string_view password(line.data() + 20, line.size() - 20);
    const int file = open(folder.path("conf").c_str(), O_WRONLY | O_CREAT, 0600);
    ASSERT_EQ(write(file, line.data(), line.size()), static_cast<ssize_t>(line.size()));
    close(file);
    {
        const handle cfg = open_file(folder.path("conf"));
        ASSERT_EQ(bind_to(cfg), 0);
        cfg_message* result = nullptr;
        ASSERT_EQ(cfg_search_s(cfg.get(), "", CFG_SCOPE_SUB, "pw=x", nullptr, 0, &result), 0);
        cfg_msgfree(result);
        ASSERT_EQ(cfg_search_s(cfg.get(), "", CFG_SCOPE_SUB, "pw=*", nullptr, 0, &result), 0);
        char** const values = cfg_get_values(cfg.get(), result, "pw");
        EXPECT_EQ(*values, password);
        EXPECT_NE(heap().find(password.substr(16, 20)), std::string_view::npos) << "the test looks in the wrong place";
        cfg_value_free(values);
        cfg_msgfree(result);
    }
    EXPECT_EQ(heap().find(password.substr(16, 20)), std::string_view::npos);
}

#endif

}  // namespace

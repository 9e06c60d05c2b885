// Entries from text and to text: against additions line by line, and through print, parse and print again.
#include "servers/vrnd/libdirbase/model/entry_text.h"

#include <cstring>
#include <random>
#include <thread>

#include "servers/vrnd/libdirbase/model/entry_ber.h"
#include "tests/servers/vrnd/libdirbase/model/model_fixture.h"

using namespace std::string_literals;
using test_support::debug_catcher;

namespace {

struct free_entry {
    void operator()(Entry* entry) const { entry_free(entry); }
};
using entry_guard = std::unique_ptr<Entry, free_entry>;

class EntryText : public model_test::Model {};

entry_guard read(std::string text, int check_duplicates = 0, int normalize = 0, int trim = 0)
{
    return entry_guard(str2entry_memberFix(text.data(), check_duplicates, normalize, trim));
}

std::string written(const Entry* entry, int print_id = 0)
{
    lockEnt2StrMutex();
    std::size_t length = 0;
    const char* text = entry2str(entry, &length, print_id);
    const std::string copy = text == nullptr ? "(null)" : std::string(text, length);
    EXPECT_TRUE(text == nullptr || (std::strlen(text) == length && ecur_global == ebuf_global + length));
    unlockEnt2StrMutex();
    return copy;
}

// In a buffer of the caller's that has so many bytes at the start.
std::string without_members(const Entry* entry, int print_id = 0, bool password_state = true, std::size_t size = 0)
{
    char* buffer = size == 0 ? nullptr : static_cast<char*>(std::malloc(size));
    std::size_t length = 0;
    const char* text = password_state ? entry2str_wo_members(entry, &length, print_id, &buffer, &size, 0)
                                      : entry2str_wo_members_and_pwd_attribs(entry, &length, print_id, &buffer, &size);
    EXPECT_EQ(text, buffer);
    EXPECT_LT(length, size);
    std::string copy(text, length);
    std::free(buffer);
    return copy;
}

// All that an addition leaves behind, in order of arrival.
std::string state_of(const Entry& entry)
{
    std::string state;
    for (const Attribute* attr = entry.e_attrs; attr != nullptr; attr = attr->a_next) {
        state += attr->a_type + "="s + model_test::joined(attr->a_vals) + " tree " + model_test::tree_of(attr) + "\n";
    }
    return state + std::to_string(entry.e_member_count);
}

TEST_F(EntryText, LinesBecomeAnEntry)
{
    struct {
        std::string text;
        const char* expected;  // the text written with the id; null for no entry
    } const table[] = {
        {"5\ndn: cn=a\ncn: a\n", "5\ndn: cn=a\ncn: a\n"},
        {"-1\ndn: cn=a\n", "-1\ndn: cn=a\n"},
        {"99999999999\ndn: cn=a\n", "2147483647\ndn: cn=a\n"},
        {"cn: a\nDN: cn=a", "0\ndn: cn=a\ncn: a\n"},
        {"dn: cn=a\n\ncn: b\n", "0\ndn: cn=a\n"},
        {"dn: cn=a\ndn: cn=b\ncn: a\n", "0\ndn: cn=a\ncn: a\n"},
        {"dn: cn=a\ngarbage\ncn:: Y!==\n# c\ndescription:\n", "0\ndn: cn=a\ndescription: \n"},
        {"dn:: Y249YQ==\ncn: a\n b\n  c\ncn;lang-en: <\n", "0\ndn: cn=a\ncn: ab c\ncn;lang-en:: PA==\n"},
        {"dn: cn=a\ncn: 1\nsn: 2\nCN: 3\n2.5.4.3: 4\n", "0\ndn: cn=a\ncn: 1\ncn: 3\ncn: 4\nsn: 2\n"},
        {"dn: cn=a\r\ncn: b\r\n\r\n", "0\ndn:: Y249YQ0=\ncn:: Yg0=\n"},
        {"dn: cn=a\ncert:< file:///etc/hostname\n", "0\ndn: cn=a\ncert: file:///etc/hostname\n"},
        {"dn:\n: x\n", "0\ndn: \n: x\n"},
        {"\n dn: cn=a\n", nullptr},  // a fold at the start is an empty line
        {"dn: cn=a\x01\ncn: b\x01 c\n", "0\ndn: cn=a\ncn: b c\n"},
        {"5", nullptr},
        {"5\n", nullptr},
        {"cn: a\n", nullptr},
        {"", nullptr},
        {"dn: cn=a\ncn;lang-e1: a\n", nullptr},
        {std::string("dn: cn=a\ncn: b\0cn: c", 21), "0\ndn: cn=a\ncn: b\n"},
    };
    for (const auto& row : table) {
        const entry_guard entry = read(row.text);
        EXPECT_EQ(written(entry.get(), 1), row.expected == nullptr ? "(null)" : row.expected) << row.text;
    }
    EXPECT_EQ(str2entry(nullptr, 0, 0), nullptr);
    EXPECT_STREQ(read("dn: CommonName = a , sn=B\n")->e_norm_dn, "CN=A,SN=B");
    EXPECT_STREQ(read("dn: no dn\n")->e_norm_dn, "");

    const debug_catcher log;
    read("7\ndn: cn=a\ndn: cn=b\nx\ncn;lang-e1: a\n");
    read("8\n");
    read("8\ncn: a\n");
    for (const char* line :
         {"str2entry_memberFix: entry ID=7 has multiple DNs \"cn=a\" and \"cn=b\" (second ignored)\n",
          "str2entry_memberFix: str_parse_line rc=-1\n",
          "Error - str2entry_memberFix: returning NULL (attr_merge failed)\n",
          "str2entry_memberFix: returning NULL (missing newline after id)\n",
          "Error - str2entry_memberFix: returning NULL (entry ID=8 has NULL dn)\n"}) {
        EXPECT_TRUE(log.has(line)) << line;
    }
}

TEST_F(EntryText, GatheredValuesEndAsTheyDoOneByOne)
{
    std::string text = "dn: cn=a\n";
    for (const char* line : {"cn: a",
                             "cn: A",
                             "cn: b",
                             "CN: c",
                             "ownerSource: cn=x",
                             "ownerSource: default",
                             "ownerSource: cn=X",
                             "description: default",
                             "description: DEFAULT",
                             "oneWay: p",
                             "oneWay: p",
                             "twoWay: p",
                             "twoWay: P",
                             "twoWay: p",
                             "member: cn=a",
                             "member: CN = A",
                             "number: 1",
                             "number: 01",
                             "cert: x",
                             "cert: x",
                             "unknown: u",
                             "unknown: U",
                             "cn: d",
                             "cn: D",
                             "unknown: w"}) {
        text += line + "\n"s;
    }
    for (int i = 0; i < 200; ++i) {
        text += "a: " + std::to_string(i % 150) + "\n";
    }
    for (const auto& [check_duplicates, normalize] : {std::pair(0, 0), {1, 1}, {0, 1}, {1, 0}, {1, 2}}) {
        model_test::test_entry slow;
        std::string rest = text.substr(text.find('\n') + 1);
        for (std::size_t end = 0; (end = rest.find('\n')) != std::string::npos; rest.erase(0, end + 1)) {
            const std::size_t colon = rest.find(':');
            ASSERT_EQ(slow.merge(rest.substr(0, colon).c_str(), {rest.substr(colon + 2, end - colon - 2)},
                                 check_duplicates, normalize),
                      0);
        }
        const entry_guard entry = read(text, check_duplicates, normalize);
        ASSERT_NE(entry, nullptr);
        EXPECT_EQ(state_of(*entry), state_of(slow)) << check_duplicates << normalize;
    }
    EXPECT_EQ(read("dn: cn=a\nnumber: 1\nnumber: x\n", 1, 1), nullptr);
}

TEST_F(EntryText, MembersAreTrimmedInReadingAndInWriting)
{
    const std::pair<const char*, int> table[] = {
        {"member: CN=NULL\n", 0x02},       {"MEMBER: cn=Null\n", 0x02},      {"member: cn=x\n", 0x02},
        {"uniquemember: CN=NULL\n", 0x04}, {"member;lang-en: CN=NULL\n", 0}, {"cn: CN=NULL\n", 0},
    };
    for (const auto& [line, flag] : table) {
        const entry_guard trimmed = read("dn: cn=a\n"s + line, 0, 0, 1);
        EXPECT_EQ(trimmed->e_flag, flag) << line;
        const bool dropped = flag != 0 && strcasestr(line, "cn=null") != nullptr;
        EXPECT_EQ(trimmed->e_attrs == nullptr, dropped) << line;
        EXPECT_EQ(read("dn: cn=a\n"s + line)->e_flag, 0);
    }
    std::string text = "dn: cn=a\n";
    for (int i = 0; i < 1000; ++i) {
        text += "member: cn=" + std::to_string(i) + "\n";
    }
    const entry_guard group = read(text + "uniqueMember: cn=x\nunknown: u\npwdHistory: h\ncn: g\n");
    EXPECT_EQ(without_members(group.get(), 1),
              "0\ndn: cn=a\nmember: CN=NULL\nuniqueMember: CN=NULL\nunknown: u\npwdHistory: h\ncn: g\n");
    EXPECT_EQ(written(group.get()).size(), text.size() + 50);
    group->e_id = -2147483647 - 1;
    EXPECT_EQ(without_members(group.get(), 1, false),
              "-2147483648\ndn: cn=a\nmember: CN=NULL\nuniqueMember: CN=NULL\ncn: g\n");
}

TEST_F(EntryText, ValuesOfTypeOnlyAttributesAreMaskedWithTheId)
{
    const entry_guard entry = read("dn: cn=a\ncn: 1\ncn: 2\nsn: 3\n");
    asyntaxinfo* info = model_test::info_of("cn");
    info->return_value = 2;
    EXPECT_EQ(written(entry.get(), 1), "0\ndn: cn=a\ncn: *\ncn: *\nsn: 3\n");
    EXPECT_EQ(written(entry.get()), "dn: cn=a\ncn: 1\ncn: 2\nsn: 3\n");
    EXPECT_EQ(without_members(entry.get(), 1), "0\ndn: cn=a\ncn: 1\ncn: 2\nsn: 3\n");
    info->return_value = 0;
    lockEnt2StrMutex();
    EXPECT_STREQ(entry2str_options(entry.get(), nullptr, 2), "dn: cn=a\ncn: 1\ncn: 2\nsn: 3\n");
    EXPECT_EQ(entry2str(nullptr, nullptr, 0), nullptr);
    unlockEnt2StrMutex();
}

TEST_F(EntryText, AnyEntryReadsBackAsItWas)
{
    std::mt19937 random(1);
    const char* const names[] = {"cn",   "cn;lang-en", "unknown",    "a-rather-long-name-of-an-attribute",
                                 "cert", "B",          "description"};
    for (int i = 0; i < 2000; ++i) {
        model_test::test_entry entry;
        char dn[] = "cn=\xc3\xa4,cn=b";
        entry.e_dn = dn;
        entry.e_id = static_cast<std::int32_t>(random());
        for (const char* name : names) {
            std::vector<std::string> values(random() % 4);
            for (std::string& value : values) {
                value.resize(random() % (random() % 10 == 0 ? 500 : 30));
                const auto kind = random() % 3;
                for (char& c : value) {
                    c = static_cast<char>(kind == 0 ? random() : ' ' + random() % (kind == 1 ? 95u : 30u));
                }
            }
            ASSERT_EQ(entry.merge(name, values, 0, 0), 0);
        }
        const std::string text = written(&entry, 1);
        const entry_guard again = read(text);
        ASSERT_EQ(written(again.get(), 1), text);
        for (const Attribute* attr = again->e_attrs; attr != nullptr; attr = attr->a_next) {
            const Attribute* other = entry.e_attrs;
            while (std::strcmp(other->a_type, attr->a_type) != 0) {
                other = other->a_next;
            }
            ASSERT_EQ(model_test::joined(attr->a_vals), model_test::joined(other->a_vals));
        }
        // A buffer of any size is grown to what is needed, and no further than it goes.
        ASSERT_EQ(without_members(&entry, 1, true, random() % (text.size() + 100)), text);
        entry.e_dn = nullptr;
    }
}

TEST_F(EntryText, RoomGrowsByItsSteps)
{
    struct {
        std::size_t used, needed, size, expected;
    } const table[] = {
        {0, 0, 0, 1024},        {0, 10, 0, 1024},        {0, 1024, 0, 1024},
        {0, 1025, 0, 2048},     {0, 2048, 0, 3072},      {1000, 24, 1024, 1024},
        {1000, 25, 1024, 2048}, {100, 3000, 1024, 4096}, {1024, 0, 1024, 1024},
    };
    for (const auto& row : table) {
        char* buffer = row.size == 0 ? nullptr : static_cast<char*>(std::malloc(row.size));
        char* cursor = buffer + row.used;
        std::size_t size = row.size;
        int error = 7;
        MAKE_SPACE(row.needed, &error, &buffer, &cursor, &size);
        EXPECT_EQ(error, 0);
        EXPECT_EQ(size, row.expected) << row.used << " " << row.needed;
        EXPECT_EQ(cursor, buffer + row.used);
        std::free(buffer);
    }
}

TEST_F(EntryText, ThreadsWriteIntoBuffersOfTheirOwnOrTakeTurns)
{
    const std::string text =
        "dn: cn=a\ncn: b\nmember: cn=x\nmember: cn=y\ndescription: " + std::string(300, 'x') + "\n";
    const entry_guard shared = read(text, 1, 1);
    const std::string expected = without_members(shared.get());
    const std::string whole = written(shared.get());
    std::vector<std::thread> threads;
    for (int t = 0; t < 4; ++t) {
        threads.emplace_back([&] {
            for (int i = 0; i < 200; ++i) {
                EXPECT_EQ(without_members(shared.get()), expected);
                EXPECT_EQ(written(shared.get()), whole);
                EXPECT_EQ(written(read(text, 1, 1).get()), whole);
                char* ber = nullptr;
                std::size_t length = 0;
                EXPECT_EQ(entry2ber(shared.get(), &ber, &length), 0);
                std::free(ber);
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
}

TEST_F(EntryText, AHundredThousandAttributesAndAMegabyteOfOneValueAreRead)
{
    std::string text = "dn: cn=a\n";
    for (int i = 0; i < 100'000; ++i) {
        text += "x" + std::to_string(i * 7919 % 100'000) + ": v\n";
    }
    text += "cn: " + std::string(3'000'000, ' ') + "\n";
    EXPECT_EQ(written(read(written(read(text).get())).get()).size(),
              text.size() - 3'000'000 + 4'000'000 + 1 + 2 * 52631);
}

TEST_F(EntryText, BerHoldsTheDnAndEachAttribute)
{
    const entry_guard entry = read("dn: cn=a\ncn: b\ncn: " + std::string(200, 'c') + "\nsn:\n");
    char* ber = nullptr;
    std::size_t length = 0;
    ASSERT_EQ(entry2ber(entry.get(), &ber, &length), 0);
    EXPECT_EQ(std::string(ber, length), "\x30\x81\xeb\x04\x04"
                                        "cn=a"
                                        "\x30\x81\xe2"
                                        "\x30\x81\xd5\x04\x02"
                                        "cn"
                                        "\x31\x81\xce\x04\x01"
                                        "b"
                                        "\x04\x81\xc8" +
                                            std::string(200, 'c') + "\x30\x08\x04\x02sn\x31\x02\x04\x00"s);
    std::free(ber);
    const debug_catcher log;
    const Entry no_dn = {};
    EXPECT_EQ(entry2ber(&no_dn, &ber, &length), 1);
    EXPECT_EQ(entry2ber(nullptr, &ber, &length), 1);
    EXPECT_TRUE(ber == nullptr && length == 0 && log.count() == 1);
}

}  // namespace

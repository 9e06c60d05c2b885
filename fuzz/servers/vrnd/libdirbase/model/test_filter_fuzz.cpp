// Any filter on any entry: test_filter gives what the slow evaluator of the tests gives, and changes neither.
//
// Input: the flags (a byte), the filter up to the first line feed, and behind it the entry, with a letter in place of
// the name of an attribute in front of each ":" (another character there begins no line). Flags: 1 the filter is
// normalised, 2 values are unchecked and without trees, 4 attributes encrypted two ways are encoded and decoded.
#include <array>
#include <string>
#include <string_view>

#include "fuzz/support/fuzz_support.h"
#include "servers/vrnd/libdirbase/base/server_globals.h"
#include "servers/vrnd/libdirbase/model/filter_evaluation.h"
#include "servers/vrnd/libdirbase/model/filter_guards.h"
#include "servers/vrnd/str2filter.h"
#include "tests/support/slow_filter.h"

using fuzz_support::expect;

namespace {

#define ARC "1.3.6.1.4.1.1466.115.121.1."

// One attribute of each kind.
constexpr char definitions[] =
    "ldapSyntaxes { ( " ARC "5 ) ( " ARC "7 ) ( " ARC "12 ) ( " ARC "15 ) ( " ARC "24 ) ( " ARC "27 ) ( " ARC
    "38 ) ( " ARC "50 ) ( " ARC "53 ) }\n"
    "matchingRules { ( 2.5.13.0 NAME 'objectIdentifierMatch' SYNTAX " ARC "38 )\n"
    "( 2.5.13.1 NAME 'distinguishedNameMatch' SYNTAX " ARC "12 )\n"
    "( 2.5.13.2 NAME 'caseIgnoreMatch' SYNTAX " ARC "15 ) ( 2.5.13.5 NAME 'caseExactMatch' SYNTAX " ARC "15 )\n"
    "( 2.5.13.14 NAME 'integerMatch' SYNTAX " ARC "27 ) ( 2.5.13.20 NAME 'telephoneNumberMatch' SYNTAX " ARC "50 )\n"
    "( 2.5.13.27 NAME 'generalizedTimeMatch' SYNTAX " ARC "24 ) }\n"
    "attributeTypes { ( 2.5.4.0 NAME 'objectClass' EQUALITY objectIdentifierMatch SYNTAX " ARC "38 )\n"
    "( 2.5.4.3 NAME ( 'commonName' 'cn' ) EQUALITY caseIgnoreMatch SYNTAX " ARC "15 )\n"
    "( 2.5.4.31 NAME 'member' EQUALITY distinguishedNameMatch SYNTAX " ARC "12 )\n"
    "( 9.5 NAME 'owner' EQUALITY distinguishedNameMatch SYNTAX " ARC "12 )\n"
    "( 9.6 NAME 'ref' EQUALITY caseExactMatch SYNTAX " ARC "15 ) ( 9.7 NAME 'cert' SYNTAX " ARC "5 )\n"
    "( 9.8 NAME 'number' EQUALITY integerMatch SYNTAX " ARC "27 ) ( 9.9 NAME 'flag' SYNTAX " ARC "7 )\n"
    "( 9.10 NAME 'time' EQUALITY generalizedTimeMatch SYNTAX " ARC "24 ) ( 9.21 NAME 'utc' SYNTAX " ARC "53 )\n"
    "( 9.11 NAME 'oneWay' EQUALITY caseIgnoreMatch SYNTAX " ARC "15 )\n"
    "( 9.12 NAME 'twoWay' EQUALITY caseIgnoreMatch SYNTAX " ARC "15 )\n"
    "( 9.20 NAME 'tel' EQUALITY telephoneNumberMatch SYNTAX " ARC "50 ) }\n"
    "XANattributeTypes { ( 9.11 ENCRYPT SSHA ) ( 9.12 ENCRYPT AES-256 ) }\n";

constexpr std::array names = {
    "cn",
    "commonName;lang-en",
    "cn;lang-de",
    "member",
    "member;lang-en",
    "owner",
    "ref",
    "ref;lang-en",
    "cert",
    "flag",
    "number",
    "time",
    "utc",
    "tel",
    "objectClass",
    "none",
    "oneWay",
    "twoWay",
};

aes_key_data key = {32, "0123456789abcdef0123456789abcde", "salt"};

struct free_entry {
    void operator()(Entry* entry) const { entry_free(entry); }
};

void add_line(Entry& entry, std::string_view line, bool unchecked)
{
    const std::size_t colon = line.find(':');
    if (colon != 1) {
        return;
    }
    const std::size_t name = static_cast<unsigned char>(line[0]) - static_cast<unsigned char>('a');
    if (name >= names.size()) {
        return;
    }
    std::string text(line.substr(2));
    berval value = {text.size(), text.data()};
    berval* values[] = {&value, nullptr};
    attr_merge(&entry, names[name], values, unchecked ? 0 : 1, unchecked ? 0 : 1, nullptr);
}

void encrypt(Entry& entry)
{
    Attribute* const attr = attr_find(&entry, "twoWay", 0, nullptr);
    if (attr != nullptr) {
        attr_free_normvals(attr);
        attr_encode_attribute(attr);
        attr_create_decodedvals(attr);
    }
}

std::string described(const Entry& entry)
{
    std::string text;
    for (const Attribute* attr = entry.e_attrs; attr != nullptr; attr = attr->a_next) {
        for (berval** value = attr->a_vals; value != nullptr && *value != nullptr; ++value) {
            text.append(attr->a_type).append("=").append((*value)->bv_val, (*value)->bv_len).append("\n");
        }
    }
    return text;
}

std::string described(const Filter* filter)
{
    char* const made = filter2str(filter);
    const std::string text = made == nullptr ? "" : made;
    std::free(made);
    return text;
}

}  // namespace

extern "C" int LLVMFuzzerInitialize(int*, char***)
{
    ldcf_api_schema_init();
    ldcf_schema_g->parse_str(definitions, "fuzz");
    ldcf_schema_g->complete_nocheck();
    expect(ldcf_api_schema_complete_db_names() == 0, "the schema has its names in the store");
    for (const char* name : names) {
        expect((ldcf_api_attr_get_info(name, nullptr) == nullptr) == (std::string_view(name) == "none"),
               "the schema knows the names");
    }
    set_g_language_tags_enabled(1);
    g_DirKeyData = &key;
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    if (size == 0 || size > 4000) {
        return 0;
    }
    std::string_view rest(reinterpret_cast<const char*>(data + 1), size - 1);
    const std::string text(rest.substr(0, rest.find('\n')));
    rest.remove_prefix(std::min(text.size() + 1, rest.size()));
    const filter_guard filter(str2filter(text.c_str(), data[0] & 1));
    if (filter == nullptr) {
        return 0;
    }
    Entry* made = nullptr;
    expect(CreateEntry(&made) == 0, "there is an entry");
    const std::unique_ptr<Entry, free_entry> entry(made);
    while (!rest.empty()) {
        const std::string_view line = rest.substr(0, rest.find('\n'));
        add_line(*entry, line, (data[0] & 2) != 0);
        rest.remove_prefix(std::min(line.size() + 1, rest.size()));
    }
    if ((data[0] & 4) != 0) {
        encrypt(*entry);
    }
    const std::string entry_before = described(*entry);
    const std::string filter_before = described(filter.get());
    const int result = test_filter(entry.get(), filter.get());
    expect(result == test_support::slow_test_filter(*entry, filter.get()), "the slow evaluator agrees");
    expect(described(*entry) == entry_before, "the entry is as it was");
    expect(described(filter.get()) == filter_before, "the filter is as it was");
    return 0;
}

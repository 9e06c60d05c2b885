// Normal forms of any text by every syntax code: both forms of the call agree, a normal form is its own (where the rule
// takes it again), a refused text stays, and a value tree finds what it holds.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <string>

#include "fuzz/support/fuzz_support.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/model/attr_value_tree.h"
#include "servers/vrnd/libdirbase/model/value_add.h"
#include "servers/vrnd/libdirbase/model/value_normalize.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"

namespace {

using fuzz_support::expect;

constexpr std::uint32_t bit_string = SC_BIT_STRING | SC_CIS;
constexpr std::uint32_t codes[] = {
    SC_CIS,
    SC_CES,
    SC_BIN,
    SC_TEL | SC_CIS,
    SC_DN | SC_CIS,
    bit_string,
    SC_NUMERIC_STRING | SC_CIS,
    SC_COUNTRY_STRING | SC_CIS,
    SC_INT,
    SC_BOOL,
    SC_GT,
    SC_UTCT,
};

// A text of each kind of type for DNs.
constexpr char schema_text[] =
    "attributeTypes { ( 2.5.4.3 NAME ( 'commonName' 'cn' ) SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 )\n"
    "( 2.5.4.4 NAME 'sn' SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 )\n"
    "( 2.5.4.5 NAME 'e' EQUALITY caseExactMatch SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 ) }\n"
    "ldapSyntaxes { ( 1.3.6.1.4.1.1466.115.121.1.15 DESC 'Directory String' ) }\n"
    "matchingRules { ( 2.5.13.5 NAME 'caseExactMatch' SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 ) }\n";

[[maybe_unused]] const bool prepared = [] {
    ldcf_api_schema_init();
    ldcf_schema_g->parse_str(schema_text, "fuzz");
    ldcf_schema_g->complete_nocheck();
    return ldcf_api_schema_complete_db_names() == 0;
}();

struct outcome {
    int result;
    std::string text;
};

outcome by_text(const std::string& text, std::uint32_t code)
{
    char* copy = strdup(text.c_str());
    const int result = value_normalize(&copy, code);
    outcome made = {result, copy};
    std::free(copy);
    return made;
}

outcome by_berval(const std::string& text, std::uint32_t code)
{
    berval value = {text.size(), strdup(text.c_str())};
    const int result = value_normalize_berval(&value, code, 0);
    expect(result != 0 || value.bv_len == std::strlen(value.bv_val), "the length is that of the normal form");
    outcome made = {result, value.bv_val};
    std::free(value.bv_val);
    return made;
}

// Whether a text holds an overlong form of a character: folding keeps its last bytes, and a DN with such bytes is none.
bool has_overlong_form(const std::string& text)
{
    for (std::size_t i = 0; i + 1 < text.size(); ++i) {
        const auto lead = static_cast<unsigned char>(text[i]);
        if (lead == 0xC0 || lead == 0xC1 || (lead == 0xE0 && static_cast<unsigned char>(text[i + 1]) < 0xA0)) {
            return true;
        }
    }
    return false;
}

// A value that has been added is found, and once deleted it isn't.
void check_tree(const std::string& text, const std::string& other, std::uint32_t code)
{
    Attribute attr = {};
    char name[] = "";
    attr.a_type = name;
    berval bervals[] = {{other.size(), const_cast<char*>(other.data())}, {text.size(), const_cast<char*>(text.data())}};
    berval* first[] = {&bervals[0], nullptr};
    berval* second[] = {&bervals[1], nullptr};
    value_add_normalize(&attr.a_vals, first, code, &attr, 1, 0);
    const std::int64_t before = attr.a_numvals;
    const bool known = value_find(&attr, &bervals[1], code, 1) == 0;
    const int result = value_add_normalize(&attr.a_vals, second, code, &attr, 1, 0);
    expect(attr.a_numvals == before + (result == 0 && !known ? 1 : 0), "only new and legal values are added");
    if (result == 0) {
        expect(value_find(&attr, &bervals[1], code, 1) == 0, "an added value is found");
        expect(delete_valuetree_value(&attr, &bervals[1], code) == 0, "a found value can be deleted");
        expect((code & SC_BIN) != 0 || value_find(&attr, &bervals[1], code, 1) != 0, "a deleted value is gone");
    }
    ber_bvecfree(attr.a_vals);
    attr_free_normvals(&attr);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    if (size == 0) {
        return 0;
    }
    const std::uint32_t code = codes[data[0] % std::size(codes)];
    std::string text(reinterpret_cast<const char*>(data + 1), size - 1);
    const std::string raw = text;
    text.resize(std::strlen(text.c_str()));

    const outcome normal = by_text(text, code);
    const outcome same = by_berval(text, code);
    expect(normal.result == same.result && normal.text == same.text, "both forms of the call agree");
    expect(normal.result == 0 || normal.text == text, "a refused text stays");
    if (normal.result == 0 && code != bit_string && !((code & SC_DN) != 0 && has_overlong_form(text))) {
        const outcome again = by_text(normal.text, code);
        expect(again.result == 0 && again.text == normal.text, "a normal form is its own normal form");
    }
    const std::size_t half = raw.size() / 2;
    check_tree(raw.substr(0, half), raw.substr(half), code);
    return 0;
}

// Attributes and their values, call by call, with every allocation failing in turn.
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the library calls

#include "libraries/libber/ldap_result.h"
#include "servers/vrnd/libdirbase/base/server_globals.h"
#include "servers/vrnd/libdirbase/model/attr_names.h"
#include "servers/vrnd/libdirbase/model/dn_esc.h"
#include "servers/vrnd/libdirbase/model/dn_expand.h"
#include "servers/vrnd/libdirbase/model/dn_plain.h"
#include "servers/vrnd/libdirbase/model/entry_text.h"
#include "servers/vrnd/libdirbase/model/language_tag.h"
#include "servers/vrnd/libdirbase/model/value_add.h"
#include "servers/vrnd/libdirbase/model/value_compare.h"
#include "servers/vrnd/libdirbase/model/value_normalize.h"
#include "tests/servers/vrnd/libdirbase/model/mods_fixture.h"
#include "tests/support/alloc_table.h"

using namespace model_test;
using namespace test_support;

namespace {

using AttrCallsAlloc = Model;

// An entry made calmly, with "cn=a|b;sn=c" in it, its records looked up.
struct calm_entry {
    explicit calm_entry(const char* text)
    {
        const alloc_fault_pause pause;
        entry = std::make_unique<test_entry>();
        fill(*entry, text);
    }
    calm_text tell_with(const calm_text& result) const
    {
        return calm([&] { return tell(result, " ", text_of_attributes(*entry)); });
    }
    std::unique_ptr<test_entry> entry;
};

// Tells a node's normal form and releases it.
calm_text tell_node(int result, AttrvalsNorm* node)
{
    const calm_text text = node == nullptr ? "-" : calm([&] { return calm_text(text_of(*node->value)); });
    free_AttrvalsNorm(node);
    return tell(result, " ", text);
}

// Makes the record of a type be missing, as it is ahead of its first look-up.
void forget(const char* name)
{
    const alloc_fault_pause pause;
    ldcf_api_attrtype_reset_info(name);
}

constexpr std::uint32_t dn_code = SC_DN | SC_CIS;

TEST_F(AttrCallsAlloc, NamesAndTags)
{
    const quiet_logs quiet;
    info_of("cn");
    info_of("sn");
    expect_outcomes({
        {"parse_language_tags",
         [] {
             char* base = nullptr;
             char* tag = nullptr;
             const int result = parse_language_tags("cn;lang-EN", &base, &tag, LANGUAGE_BASE_AND_TAG, 1);
             return tell(result, " ") + tell_freed(base) + " " + tell_freed(tag);
         },
         "0 cn lang-en",
         {"90 (null) (null)"}},
        {"parse_language_tags_with_buffer",
         [] {
             char* base = nullptr;
             char tag[language_tag_buffer] = "old";
             const int result =
                 parse_language_tags_with_buffer("cn;lang-EN", &base, tag, nullptr, LANGUAGE_BASE_AND_TAG);
             return tell(result, " ", tag, " ") + tell_freed(base);
         },
         "0 lang-en cn",
         {"90  (null)"}},
        {"verifyAttributeMapping",
         [] {
             char* first = nullptr;
             char* second = nullptr;
             const int result = verifyAttributeMapping("cn $ mail", &second, &first);
             return tell(result, " ") + tell_freed(first) + " " + tell_freed(second);
         },
         "0 cn mail",
         {"90 (null) (null)"}},
    });
}

// Without memory for its record an attribute looks like one that the schema doesn't know.
TEST_F(AttrCallsAlloc, LookUpsThatHaveToMakeTheRecordFirst)
{
    const quiet_logs quiet;
    set_g_language_tags_enabled(1);
    const auto lookup = [](const char* name, auto call) {
        return [=] {
            forget("sn");
            const calm_text told = tell(call(name));
            forget("sn");
            return told;
        };
    };
    expect_outcomes({
        {"ldcf_api_attr_get_info", lookup("sn", [](const char* name) { return info_of(name) != nullptr; }), "1", {"0"}},
        {"attr_syntax", lookup("sn", attr_syntax), tell(SC_CIS).str(), {tell(SC_CIS).str()}},
        {"attr_syntax_for_filter", lookup("sn;lang-en", attr_syntax_for_filter), tell(SC_CIS).str(), {"0"}},
        {"attr_syntax_for_filter_return_asi",
         lookup("sn",
                [](const char* name) {
                    asyntaxinfo* info = nullptr;
                    attr_syntax_for_filter_return_asi(name, &info);
                    return info != nullptr;
                }),
         "1",
         {"0"}},
        {"is_subtype_attr",
         lookup("surname", [](const char* name) { return is_subtype_attr(name, "sn;lang-en"); }),
         "1",
         {"0"}},
        {"dn_attr_get_short_name",
         lookup("surname", [](const char* name) { return tell(dn_attr_get_short_name(name, nullptr)); }),
         "sn",
         {"(null)"}},
        {"ShortRDNType",
         lookup("surname", [](const char* name) { return tell(ShortRDNType(name)); }),
         "sn",
         {"(null)"}},
        {"FirstRDNType_and_syntax",
         lookup("2.5.4.4",
                [](const char* name) {
                    asyntaxinfo* info = nullptr;
                    return tell(FirstRDNType_and_syntax(name, &info));
                }),
         "sn",
         {"(null)"}},
        // What stores an attribute, or refuses one as unknown, says that there was no memory.
        {"attr_merge",
         lookup("sn",
                [](const char* name) {
                    const calm_entry one("cn=a");
                    const value_list& values = *calm([] { return new value_list({"x"}); });
                    const int result = attr_merge(one.entry.get(), name, values.get(), 0, 0, nullptr);
                    calm([&] { delete &values; });
                    return one.tell_with(tell(result));
                }),
         "0 cn=a;sn=x",
         {"90 cn=a", "90 cn=a;sn="}},
        {"str2entry",
         lookup("dn: a=x\nsn: y\n",
                [](const char* text) {
                    char* const copy = heap_copy(text);
                    Entry* const made = str2entry(copy, 0, 0);
                    const bool known = made != nullptr && made->e_attrs->a_info != nullptr;
                    std::free(copy);
                    entry_free(made);
                    return tell(made != nullptr, known);
                }),
         "11",
         {"00"}},
        {"expand_rdn",
         lookup("sn=y,a=x",
                [](const char* dn) {
                    const calm_entry one("cn=a");
                    one.entry->e_dn = const_cast<char*>(dn);
                    return tell(expand_rdn(one.entry.get()));
                }),
         "0",
         {"90"}},
        {"verifyAttributeMapping",
         lookup("sn$mail", [](const char* text) { return verifyAttributeMapping(text, nullptr, nullptr); }),
         "0",
         {"90"}},
        {"dn_normalize_esc",
         lookup("sn=a",
                [](const char* name) {
                    ldap_escDN* dn = dn_normalize_esc(name);
                    const int result = dn == nullptr ? -1 : dn->result;
                    free_ldap_escDN(&dn);
                    return result;
                }),
         "0",
         {"-1", "90"}},
    });
    set_g_language_tags_enabled(0);
}

// The name in a version's name takes memory; without it there is no such version.
TEST_F(AttrCallsAlloc, RecordsOfAnEntry)
{
    const quiet_logs quiet;
    static constexpr char version[] = "cn;lang-en";
    const auto with_version = [] {
        auto one = std::make_unique<calm_entry>("cn=x");
        EXPECT_EQ(one->entry->merge("cn;lang-en", {"a", "b"}), 0);
        return one;
    };
    const auto at = with_version();
    const Entry* const entry = at->entry.get();
    expect_outcomes({
        {"verify_attribute", [&] { return tell(verify_attribute(entry, version, "A", 1)); }, "1", {"0"}},
        {"attr_get_normvals_array",
         [&] { return tell_made(attr_get_normvals_array(entry->e_attrs), std::free); },
         "made",
         {"(null)"}},
        {"CreateEntry",
         [] {
             Entry* made = nullptr;
             const int result = CreateEntry(&made);
             return tell(result, " ") + tell_made(made, entry_free);
         },
         "0 made",
         {"90 (null)"}},
        {"alloc_ldapmod", [] { return tell_made(alloc_ldapmod(), free_ldapmod); }, "made", {"(null)"}},
    });
    const std::string before = "cn=x;cn;lang-en=a|b";
    expect_outcomes({
        {"do_attr_merge",
         [&] {
             const auto one = calm(with_version);
             const int result = do_attr_merge(one->entry.get(), version, "c", nullptr);
             return one->tell_with(tell(result));
         },
         "0 cn=x;cn;lang-en=a|b|c",
         {"90 " + before}},
        {"add_attr_to_entry",
         [&] {
             const auto one = calm(with_version);
             const int result = add_attr_to_entry(one->entry.get(), version, "c", 1);
             return one->tell_with(tell(result));
         },
         "0 cn=x;cn;lang-en=a|b|c",
         {"90 " + before}},
        {"delete_values_from_entry",
         [&] {
             const auto one = calm(with_version);
             LDAPMod* const mod = calm([] { return make_mod(0x81, version, "b"); });
             const int result = delete_values_from_entry(one->entry.get(), mod);
             free_ldapmod(mod);
             return one->tell_with(tell(result));
         },
         "0 cn=x;cn;lang-en=a",
         {"16 " + before, "0 cn=x;cn;lang-en=a"}},
    });
}

TEST_F(AttrCallsAlloc, NormalForms)
{
    info_of("cn");
    const value_list one({"cn=a"});
    const berval& dn = *one.get()[0];
    const auto normalize = [](const char* text, std::uint32_t syntax) {
        return [=] {
            char* copy = heap_copy(text);
            const int result = value_normalize(&copy, syntax);
            return tell(result, " ") + tell_freed(copy);
        };
    };
    expect_outcomes({
        {"value_normalize", normalize("2.5.4.3=a", dn_code), "0 CN=A", {"90 2.5.4.3=a"}},
        {"value_normalize_berval",
         [] {
             berval value = {3, heap_copy("9.2=a,cn=\"b,c\"")};
             value.bv_len = std::strlen(value.bv_val);
             const int result = value_normalize_berval(&value, dn_code, 0);
             const calm_text told = tell(result, " ", value.bv_len, " ", value.bv_val);
             std::free(value.bv_val);
             return told;
         },
         "0 11 A=A,CN=B\\,C",
         {"90 14 9.2=a,cn=\"b,c\""}},
        {"value_normalize_for_tables",
         [&] {
             berval target = {};
             berval* place = &target;
             const int result = value_normalize_for_tables(&dn, &place, dn_code);
             return tell(result, " ", target.bv_len, " ") + tell_freed(target.bv_val);
         },
         "0 4 CN=A",
         {"90 0 (null)"}},
        {"create_normalized_berval_in_attrvalsNorm",
         [&] {
             AttrvalsNorm* node = nullptr;
             const int result = create_normalized_berval_in_attrvalsNorm(&node, &dn, dn_code, 1);
             return tell_node(result, node);
         },
         "0 CN=A",
         {"90 -"}},
        {"value_cmp", [&] { return tell(value_cmp(&dn, &dn, dn_code, 3)); }, "0", {"90"}},
    });
}

TEST_F(AttrCallsAlloc, ValuesOfAnAttribute)
{
    const calm_entry at("member=cn=a|cn=b");
    Attribute* const member = at.entry->find("member");
    const value_list sought({"CN=B"});
    expect_outcomes({
        {"value_find", [&] { return tell(value_find(member, sought.get()[0], dn_code, 1)); }, "0", {"-1"}},
        {"delete_valuetree_value",
         [&] {
             const calm_entry one("member=cn=a|cn=b");
             Attribute* const attr = calm([&] { return one.entry->find("member"); });
             const int result = delete_valuetree_value(attr, sought.get()[0], dn_code);
             return calm([&] { return tell(result, " ", tree_of(attr)); });
         },
         "0 CN=A",
         {"90 CN=A|CN=B"}},
        {"value_add_fast",
         [&] {
             std::int64_t capacity = 0;
             berval** array = nullptr;
             const int result = value_add_fast(&array, sought.get(), 0, 1, &capacity);
             if (result != 0) {
                 std::free(array);
                 return tell(result);
             }
             const calm_text told = calm([&] { return tell(result, " ", text_of(*array[0])); });
             array[1] = nullptr;
             ber_bvecfree(array);
             return told;
         },
         "0 CN=B",
         {"90"}},
        {"value_add_normalize",
         [&] {
             const calm_entry one("member=cn=a|cn=b");
             Attribute* const attr = calm([&] { return one.entry->find("member"); });
             const value_list& added = *calm([] { return new value_list({"cn=c"}); });
             const int result = value_add_normalize(&attr->a_vals, added.get(), dn_code, attr, 1, 0);
             return calm([&] {
                 delete &added;
                 return one.tell_with(tell(result, " ", tree_of(attr)));
             });
         },
         "0 CN=A|CN=B|CN=C member=cn=a|cn=b|cn=c",
         {"90 CN=A|CN=B member=cn=a|cn=b"}},
        {"create_normalized_values",
         [&] {
             const calm_entry one("member=cn=a|cn=b");
             Attribute* const attr = calm([&] {
                 Attribute* const found = one.entry->find("member");
                 attr_free_normvals(found);
                 return found;
             });
             std::int64_t added = -1;
             const int result =
                 create_normalized_values(VALUES_TREE_ONLY, &added, 2, 0, attr->a_vals, nullptr, attr, dn_code, 0);
             return calm([&] { return tell(result, " ", tree_of(attr)); });
         },
         "0 CN=A|CN=B",
         {"90 (none)"}},
    });
}

TEST_F(AttrCallsAlloc, EncryptedAttributes)
{
    const auto stored = [](const char* name) {
        auto entry = std::make_unique<calm_entry>((std::string(name) + "=x|y").c_str());
        EXPECT_EQ(attr_encode_attribute(entry->entry->find(name)), 0);
        return entry;
    };
    const auto at = stored("twoWay");
    Attribute* const attr = at->entry->find("twoWay");
    const quiet_logs quiet;
    expect_outcomes({
        {"dup_and_decode_vals",
         [&] {
             berval** copies = nullptr;
             const int result = dup_and_decode_vals(attr->a_vals, &copies);
             const calm_text told = calm([&] { return tell(result, " ", copies != nullptr); });
             free_dup_vals(attr->a_vals, copies);
             return told;
         },
         "0 1",
         {"90 0", "0 1"}},
        {"attr_create_decodedvals",
         [&] {
             const int result = attr_create_decodedvals(attr);
             const calm_text told = calm([&] { return tell(result, " ", attr->a_decoded != nullptr); });
             attr_free_decodedvals(attr);
             return told;
         },
         "0 1",
         {"80 0", "0 1"}},
        {"attr_encode_attribute",
         [&] {
             const calm_entry one("oneWay=x|y");
             Attribute* const clear = calm([&] { return one.entry->find("oneWay"); });
             const int result = attr_encode_attribute(clear);
             return calm([&] {
                 int stored_values = 0;
                 int clear_values = 0;
                 for (berval** value = clear->a_vals; *value != nullptr; ++value) {
                     const bool is_stored = check_format((*value)->bv_val, (*value)->bv_len) == PWD_SSHA;
                     ++(is_stored ? stored_values : clear_values);
                     EXPECT_TRUE(is_stored || (*value)->bv_len == 1);
                 }
                 return tell(result, " ", stored_values, " ", clear_values);
             });
         },
         "0 2 0",
         {"90 0 2", "90 1 1", "0 1 1", "0 2 0"}},
    });
}

}  // namespace

#endif

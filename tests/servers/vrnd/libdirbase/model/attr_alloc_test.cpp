// Attributes and their values with every allocation failing in turn.
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the library calls

#include "libraries/libber/ldap_result.h"
#include "servers/vrnd/libdirbase/base/server_globals.h"
#include "servers/vrnd/libdirbase/model/attr_names.h"
#include "servers/vrnd/libdirbase/model/dn_esc.h"
#include "servers/vrnd/libdirbase/model/dn_expand.h"
#include "servers/vrnd/libdirbase/model/dn_plain.h"
#include "servers/vrnd/libdirbase/model/entry_text.h"
#include "servers/vrnd/libdirbase/model/language_tag.h"
#include "servers/vrnd/libdirbase/model/syntax_value.h"
#include "servers/vrnd/libdirbase/model/value_add.h"
#include "servers/vrnd/libdirbase/model/value_compare.h"
#include "servers/vrnd/libdirbase/model/value_normalize.h"
#include "tests/servers/vrnd/libdirbase/model/mods_fixture.h"
#include "tests/support/alloc_table.h"

using namespace model_test;
using namespace test_support;

namespace {

using AttrAlloc = Model;

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

TEST_F(AttrAlloc, NamesAndTags)
{
    const quiet_logs quiet;
    info_of("cn");
    info_of("sn");
    expect_outcomes({
        row("parse_language_tags", "0 cn lang-en", {"90 (null) (null)"},
            [] {
                char* base = nullptr;
                char* tag = nullptr;
                const int result = parse_language_tags("cn;lang-EN", &base, &tag, LANGUAGE_BASE_AND_TAG, 1);
                return tell(result, " ") + tell_freed(base) + " " + tell_freed(tag);
            }),
        row("parse_language_tags_with_buffer", "0 lang-en cn", {"90  (null)"},
            [] {
                char* base = nullptr;
                char tag[language_tag_buffer] = "old";
                const int result =
                    parse_language_tags_with_buffer("cn;lang-EN", &base, tag, nullptr, LANGUAGE_BASE_AND_TAG);
                return tell(result, " ", tag, " ") + tell_freed(base);
            }),
        row("verifyAttributeMapping", "0 cn mail", {"90 (null) (null)"},
            [] {
                char* first = nullptr;
                char* second = nullptr;
                const int result = verifyAttributeMapping("cn $ mail", &second, &first);
                return tell(result, " ") + tell_freed(first) + " " + tell_freed(second);
            }),
    });
}

// Without memory for its record an attribute looks like one that the schema doesn't know.
TEST_F(AttrAlloc, LookUpsThatHaveToMakeTheRecordFirst)
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
        row("ldcf_api_attr_get_info", "1", {"0"},
            lookup("sn", [](const char* name) { return info_of(name) != nullptr; })),
        row("attr_syntax", tell(SC_CIS).str(), {tell(SC_CIS).str()}, lookup("sn", attr_syntax)),
        row("attr_syntax_for_filter", tell(SC_CIS).str(), {"0"}, lookup("sn;lang-en", attr_syntax_for_filter)),
        row("attr_syntax_for_filter_return_asi", "1", {"0"},
            lookup("sn",
                   [](const char* name) {
                       asyntaxinfo* info = nullptr;
                       attr_syntax_for_filter_return_asi(name, &info);
                       return info != nullptr;
                   })),
        row("is_subtype_attr", "1", {"0"},
            lookup("surname", [](const char* name) { return is_subtype_attr(name, "sn;lang-en"); })),
        row("dn_attr_get_short_name", "sn",
            lookup("surname", [](const char* name) { return tell(dn_attr_get_short_name(name, nullptr)); })),
        row("ShortRDNType", "sn", lookup("surname", [](const char* name) { return tell(ShortRDNType(name)); })),
        row("FirstRDNType_and_syntax", "sn",
            lookup("2.5.4.4",
                   [](const char* name) {
                       asyntaxinfo* info = nullptr;
                       return tell(FirstRDNType_and_syntax(name, &info));
                   })),
        // What stores an attribute, or refuses one as unknown, says that there was no memory.
        row("attr_merge", "0 cn=a;sn=x", {"90 cn=a", "90 cn=a;sn="},
            lookup("sn",
                   [](const char* name) {
                       const calm_entry one("cn=a");
                       const value_list& values = *calm([] { return new value_list({"x"}); });
                       const int result = attr_merge(one.entry.get(), name, values.get(), 0, 0, nullptr);
                       calm([&] { delete &values; });
                       return one.tell_with(tell(result));
                   })),
        row("str2entry", "11", {"00"},
            lookup("dn: a=x\nsn: y\n",
                   [](const char* text) {
                       char* const copy = heap_copy(text);
                       Entry* const made = str2entry(copy, 0, 0);
                       const bool known = made != nullptr && made->e_attrs->a_info != nullptr;
                       std::free(copy);
                       entry_free(made);
                       return tell(made != nullptr, known);
                   })),
        row("expand_rdn", "0", {"90"},
            lookup("sn=y,a=x",
                   [](const char* dn) {
                       const calm_entry one("cn=a");
                       one.entry->e_dn = const_cast<char*>(dn);
                       return tell(expand_rdn(one.entry.get()));
                   })),
        row("verifyAttributeMapping", "0", {"90"},
            lookup("sn$mail", [](const char* text) { return verifyAttributeMapping(text, nullptr, nullptr); })),
        row("dn_normalize_esc", "0", {"-1", "90"},
            lookup("sn=a",
                   [](const char* name) {
                       ldap_escDN* dn = dn_normalize_esc(name);
                       const int result = dn == nullptr ? -1 : dn->result;
                       free_ldap_escDN(&dn);
                       return result;
                   })),
    });
    set_g_language_tags_enabled(0);
}

// The name in a version's name takes memory; without it there is no such version.
TEST_F(AttrAlloc, RecordsOfAnEntry)
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
        row("verify_attribute", "1", {"0"}, [&] { return tell(verify_attribute(entry, version, "A", 1)); }),
        row("attr_get_normvals_array", [&] { return tell_made(attr_get_normvals_array(entry->e_attrs), std::free); }),
        row("CreateEntry", "0 made", {"90 (null)"},
            [] {
                Entry* made = nullptr;
                const int result = CreateEntry(&made);
                return tell(result, " ") + tell_made(made, entry_free);
            }),
        row("alloc_ldapmod", [] { return tell_made(alloc_ldapmod(), free_ldapmod); }),
    });
    const std::string before = "cn=x;cn;lang-en=a|b";
    expect_outcomes({
        row("do_attr_merge", "0 cn=x;cn;lang-en=a|b|c", {"90 " + before},
            [&] {
                const auto one = calm(with_version);
                const int result = do_attr_merge(one->entry.get(), version, "c", nullptr);
                return one->tell_with(tell(result));
            }),
        row("add_attr_to_entry", "0 cn=x;cn;lang-en=a|b|c", {"90 " + before},
            [&] {
                const auto one = calm(with_version);
                const int result = add_attr_to_entry(one->entry.get(), version, "c", 1);
                return one->tell_with(tell(result));
            }),
        row("delete_values_from_entry", "0 cn=x;cn;lang-en=a", {"16 " + before, "0 cn=x;cn;lang-en=a"},
            [&] {
                const auto one = calm(with_version);
                LDAPMod* const mod = calm([] { return make_mod(0x81, version, "b"); });
                const int result = delete_values_from_entry(one->entry.get(), mod);
                free_ldapmod(mod);
                return one->tell_with(tell(result));
            }),
    });
}

// Each call adds to an entry of its own; what fails leaves the values there were.
TEST_F(AttrAlloc, Additions)
{
    const quiet_logs quiet;
    asyntaxinfo* const description = info_of("description");
    info_of("cn");
    info_of("sn");
    const value_list values({"b", "c"});
    const auto addition = [](auto call) {
        return [=] {
            const calm_entry one("cn=a");
            const int result = call(*one.entry);
            return one.tell_with(tell(result));
        };
    };
    static char dn[] = "2.5.4.4=\"x,y\"+cn=z,sn=q";
    const auto expansion = [&](auto call) {
        return addition([=](test_entry& entry) {
            entry.e_dn = dn;
            return call(&entry);
        });
    };
    expect_outcomes({
        row("attr_merge, a version", "0 cn=a;cn;lang-en=b|c", {"90 cn=a", "90 cn=a;cn;lang-en="},
            addition([&](Entry& e) { return attr_merge(&e, "2.5.4.3;lang-en", values.get(), 0, 0, nullptr); })),
        row("attr_merge_fast", "0 cn=a;description=b|c", {"90 cn=a", "90 cn=a;description="}, addition([&](Entry& e) {
                Attribute* fast = nullptr;
                std::int64_t room = 0;
                const int result = attr_merge_fast(&e, "description", values.get(), 0, 2, &room, &fast, nullptr);
                EXPECT_TRUE(fast == nullptr || fast->a_numvals == (result == 0 ? 2 : 0));
                return result;
            })),
        row("flatattr_insert", "0 cn=a;description=", {"90 cn=a"}, addition([&](Entry& e) {
                Attribute* made = nullptr;
                return flatattr_insert(&e, description, "description", &made, nullptr);
            })),
        row("value_add", "0 cn=a|b|c", {"90 cn=a"},
            addition([&](Entry& e) { return value_add(&e.e_attrs->a_vals, values.get(), e.e_attrs); })),
        row("expand_rdn", "0 cn=a|z;sn=x,y", {"90 cn=a", "90 cn=a;sn=", "90 cn=a;sn=x,y"}, expansion(expand_rdn)),
        // By way of the last pair only, and the pairs are sorted.
        row("expand_rdn_esc", "0 cn=a|z;sn=x,y", {"90 cn=a", "0 cn=a;sn=x,y", "90 cn=a|z", "90 cn=a|z;sn="},
            expansion(expand_rdn_esc)),
        row("attr_decode_and_normalize_values", "0 B|C twoWay=b|c", {"90 (none) twoWay=b|c"},
            [&] {
                const calm_entry one("twoWay");
                Attribute* const attr = one.entry->e_attrs;
                calm([&] { value_add(&attr->a_vals, values.get(), attr); });
                const int result = attr_decode_and_normalize_values(attr);
                return calm([&] { return one.tell_with(tell(result, " ", tree_of(attr))); });
            }),
    });
    // So many that one value more makes the array grow, and more new ones than are noted without memory.
    const value_list old({"cn=a", "cn=b", "cn=\"c,;+\""});
    std::vector<std::string> texts = {"CN=B"};
    for (char c = 'd'; c < 'p'; ++c) {
        texts.push_back(std::string("cn=") + c);
    }
    const value_list added(texts);
    for (const auto& [name, drop, mode, whole, before] :
         {std::tuple("member", 1, 1, "0 15", "cn=a|cn=b|cn=\"c,;+\" CN=A|CN=B|CN=C\\,\\;\\+"),
          {"member", 0, 1, "0 16", "cn=a|cn=b|cn=\"c,;+\" CN=A|CN=B|CN=C\\,\\;\\+"},
          {"cn", 0, 0, "0 16", "cn=a|cn=b|cn=\"c,;+\" (none)"},
          {"twoWay", 1, 2, "0 15", "cn=a|cn=b|cn=\"c,;+\" CN=\"C,;+\"|CN=A|CN=B"},
          {"oneWay", 1, 1, "0 16", "CN=A|CN=B|CN=\"C,;+\" (none)"}}) {
        const auto merge = [&, name = name, drop = drop, mode = mode] {
            const auto entry = calm([&] {
                auto made = std::make_unique<test_entry>();
                EXPECT_EQ(attr_merge(made.get(), name, old.get(), drop, mode, nullptr), 0);
                return made;
            });
            const int result = attr_merge(entry.get(), name, added.get(), drop, mode, nullptr);
            return calm([&] {
                const Attribute* const attr = entry->find(name);
                EXPECT_EQ(attr->a_vals[attr->a_numvals], nullptr);
                return result == 0 ? tell(result, " ", attr->a_numvals)
                                   : tell(result, " ", joined(attr->a_vals), " ", tree_of(attr));
            });
        };
        expect_outcomes({row(name, whole, {std::string("90 ") + before}, merge)});
    }
}

TEST_F(AttrAlloc, TypedValuesAreNullWithALine)
{
    quiet_logs logs;
    const auto typed = [&](const char* text, std::uint32_t syntax) {
        return [&logs, text, syntax] {
            int result = -7;
            void* const value = str2syntaxvalue(text, syntax, &result);
            return tell(result, " ") + tell_made(value, std::free) + " " + logs.take();
        };
    };
    const auto failed = [](const char* function) {
        return std::vector{std::string("90 (null) Error - ") + function + ": malloc failed. Out of memory\n"};
    };
    expect_outcomes({
        row("str2int", "0 made ", failed("str2int"), typed("1", SC_INT)),
        row("str2bool", "0 made ", failed("str2bool"), typed("TRUE", SC_BOOL)),
        row("str2timestamp", "0 made ", failed("str2timestamp"), typed("20240101000000Z", SC_GT)),
    });
}

TEST_F(AttrAlloc, NormalForms)
{
    info_of("cn");
    const value_list one({"cn=a"});
    const berval& dn = *one.get()[0];
    const value_list texts({"a", "b"});
    const auto normalize = [](const char* text, std::uint32_t syntax) {
        return [=] {
            char* copy = heap_copy(text);
            const int result = value_normalize(&copy, syntax);
            return tell(result, " ") + tell_freed(copy);
        };
    };
    expect_outcomes({
        row("value_normalize", "0 CN=A", {"90 2.5.4.3=a"}, normalize("2.5.4.3=a", dn_code)),
        row("value_normalize_berval", "0 11 A=A,CN=B\\,C", {"90 14 9.2=a,cn=\"b,c\""},
            [] {
                berval value = {3, heap_copy("9.2=a,cn=\"b,c\"")};
                value.bv_len = std::strlen(value.bv_val);
                const int result = value_normalize_berval(&value, dn_code, 0);
                const calm_text told = tell(result, " ", value.bv_len, " ", value.bv_val);
                std::free(value.bv_val);
                return told;
            }),
        row("value_normalize_for_tables", "0 4 CN=A", {"90 0 (null)"},
            [&] {
                berval target = {};
                berval* place = &target;
                const int result = value_normalize_for_tables(&dn, &place, dn_code);
                return tell(result, " ", target.bv_len, " ") + tell_freed(target.bv_val);
            }),
        row("create_normalized_berval_in_attrvalsNorm", "0 CN=A", {"90 -"},
            [&] {
                AttrvalsNorm* node = nullptr;
                const int result = create_normalized_berval_in_attrvalsNorm(&node, &dn, dn_code, 1);
                return tell_node(result, node);
            }),
        row("value_cmp, texts", "-1", {"90"},
            [&] { return tell(value_cmp(texts.get()[0], texts.get()[1], SC_CIS, 3)); }),
        row("value_cmp", "0", {"90"}, [&] { return tell(value_cmp(&dn, &dn, dn_code, 3)); }),
    });
}

TEST_F(AttrAlloc, ValuesOfAnAttribute)
{
    const calm_entry at("member=cn=a|cn=b");
    Attribute* const member = at.entry->find("member");
    const value_list sought({"CN=B"});
    expect_outcomes({
        row("value_find", "0", {"-1"}, [&] { return tell(value_find(member, sought.get()[0], dn_code, 1)); }),
        row("delete_valuetree_value", "0 CN=A", {"90 CN=A|CN=B"},
            [&] {
                const calm_entry one("member=cn=a|cn=b");
                Attribute* const attr = calm([&] { return one.entry->find("member"); });
                const int result = delete_valuetree_value(attr, sought.get()[0], dn_code);
                return calm([&] { return tell(result, " ", tree_of(attr)); });
            }),
        row("value_add_fast", "0 CN=B", {"90"},
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
            }),
        row("value_add_normalize", "0 CN=A|CN=B|CN=C member=cn=a|cn=b|cn=c", {"90 CN=A|CN=B member=cn=a|cn=b"},
            [&] {
                const calm_entry one("member=cn=a|cn=b");
                Attribute* const attr = calm([&] { return one.entry->find("member"); });
                const value_list& added = *calm([] { return new value_list({"cn=c"}); });
                const int result = value_add_normalize(&attr->a_vals, added.get(), dn_code, attr, 1, 0);
                return calm([&] {
                    delete &added;
                    return one.tell_with(tell(result, " ", tree_of(attr)));
                });
            }),
        row("create_normalized_values", "0 CN=A|CN=B", {"90 (none)"},
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
            }),
    });
}

TEST_F(AttrAlloc, EncryptedAttributes)
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
        row("dup_and_decode_vals", "0 1", {"90 0", "0 1"},
            [&] {
                berval** copies = nullptr;
                const int result = dup_and_decode_vals(attr->a_vals, &copies);
                const calm_text told = calm([&] { return tell(result, " ", copies != nullptr); });
                free_dup_vals(attr->a_vals, copies);
                return told;
            }),
        row("attr_create_decodedvals", "0 1", {"80 0", "0 1"},
            [&] {
                const int result = attr_create_decodedvals(attr);
                const calm_text told = calm([&] { return tell(result, " ", attr->a_decoded != nullptr); });
                attr_free_decodedvals(attr);
                return told;
            }),
        row("attr_encode_attribute", "0 2 0", {"90 0 2", "90 1 1", "0 1 1", "0 2 0"},
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
            }),
    });
}

}  // namespace

#endif

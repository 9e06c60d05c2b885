// DNs with every allocation failing in turn, and how much memory they take.
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the library calls

#include "libraries/libber/ldap_result.h"
#include "servers/vrnd/libdirbase/model/be_suffix.h"
#include "servers/vrnd/libdirbase/model/dn_check.h"
#include "servers/vrnd/libdirbase/model/dn_esc.h"
#include "servers/vrnd/libdirbase/model/dn_plain.h"
#include "servers/vrnd/libdirbase/model/dn_suffix.h"
#include "tests/servers/vrnd/libdirbase/model/active_schema.h"
#include "tests/servers/vrnd/libdirbase/model/model_fixture.h"
#include "tests/support/alloc_table.h"

using namespace test_support;
using model_test::info_of;

namespace {

class DnBlocks : public model_test::with_active_schema {};

TEST_F(DnBlocks, NormalizingTakesABlockAPairAndAnRdnAndAFewMore)
{
    const struct {
        const char* dn;
        std::size_t pairs, rdns;
    } cases[] = {
        {"cn=a,ou=b,o=c", 3, 3},
        {"sn=\"b;\"+cn=a, ou=\\#b, 2.5.4.10=c, dc=d, c=de", 6, 5},
        {"memberUid=A,1.1=b,1.1=c+1.1=d+1.1=e", 5, 3},  // in names much longer than the text
    };
    for (const auto& c : cases) {
        const std::size_t points = for_each_failing_allocation([&](std::size_t) {
            ldap_escDN* dn = dn_normalize_esc(c.dn);
            EXPECT_EQ(dn == nullptr ? LDAP_NO_MEMORY : dn->result, allocation_failed() ? LDAP_NO_MEMORY : LDAP_SUCCESS);
            if (dn != nullptr && allocation_failed()) {
                EXPECT_EQ(dn->internal_error, DN_ERR_NO_MEMORY);
                EXPECT_TRUE(dn->canonical == nullptr || *dn->canonical == '\0');
            }
            free_ldap_escDN(&dn);
            EXPECT_EQ(dn, nullptr);
        });
        EXPECT_LE(points, 4 + c.pairs + c.rdns) << c.dn;
    }
}

class DnAlloc : public model_test::Model {
protected:
    DnAlloc()
    {
        for (const char* name : {"cn", "sn", "a", "member"}) {
            info_of(name);
        }
    }
};

// Result, error and texts of a record, which is released.
calm_text tell_dn(ldap_escDN* dn)
{
    if (dn == nullptr) {
        return "(null)";
    }
    const calm_text told = tell(dn->result, " ", dn->internal_error, " ", GetDNString33(dn), " ", GetDNUpper33(dn));
    free_ldap_escDN(&dn);
    return told;
}

// Changes a copy of a text in place and tells it.
calm_text tell_changed(char* (*change)(char*), const char* text)
{
    char* const copy = heap_copy(text);
    change(copy);
    return tell_freed(copy);
}

constexpr char two_pairs[] = "sn=b+cn=a,a=x";

TEST_F(DnAlloc, RecordsAreMadeWholeOrSayWhatIsMissing)
{
    const std::vector<std::string> none_or_marked = {"(null)", "90 90  ", "90 90 (null) (null)"};
    const quiet_logs quiet;
    ldap_escDN* const parsed = calm([] { return dn_normalize_esc(two_pairs); });
    expect_outcomes({
        row("dn_normalize_light_esc", "0 0 cn=a+sn=b CN=A+SN=B", none_or_marked,
            [] { return tell_dn(dn_normalize_light_esc("sn=b+cn=a")); }),
        row("parse_escDN", "0 0 sn=b+cn=a SN=B+CN=A", {"(null)", "0 90  ", "0 90 (null) (null)"},
            [] { return tell_dn(parse_escDN("sn=b+cn=a", dn_order_given, 0)); }),
        row("parse_escRDN", "0 2", {"90 0", "90 1"},
            [] {
                ldap_escDN* dn = calm([] { return new_ldap_escDN(100); });
                ldapDN_elem33* const rdn = calm(new_ldapDN_elem33);
                ldap_escDN_work work = {&dn, 0, 100};
                int error = -1;
                parse_escRDN("sn=b+cn=a", rdn, &work, dn_order_given, 0, &error);
                const calm_text told = tell(error, " ", rdn->count);
                free_ldapDN_elem33(rdn);
                free_ldap_escDN(&dn);
                return told;
            }),
        row("normAttrValue", "a,b 0", {"(null) 90"},
            [] {
                int error = 0;
                const calm_text text = tell_freed(normAttrValue("\"a,b\"", &error));
                return tell(text, " ", error);
            }),
        row("BuildDNString33", "1 0 0 cn=a+sn=b,a=x CN=A+SN=B,A=X", {"0 0 90 (null) (null)"},
            [] {
                ldap_escDN* const dn = calm([] { return dn_normalize_esc(two_pairs); });
                const bool built = BuildDNString33(dn) != nullptr;
                return tell(built, " ") + tell_dn(dn);
            }),
        row("dn_upcase_esc", "1 0 0 a=x A=X", {"0 0 90 a=x A=X"},
            [] {
                ldap_escDN* const dn = calm([] { return dn_normalize_esc("a=x"); });
                const bool built = dn_upcase_esc(dn) != nullptr;
                return tell(built, " ") + tell_dn(dn);
            }),
        row("copy_ldapDN_elem33", [&] { return tell_made(copy_ldapDN_elem33(parsed->rdns), free_ldapDN_elem33); }),
        row("new_ldap_escDN",
            [] { return tell_made(new_ldap_escDN(9), [](ldap_escDN* dn) { free_ldap_escDN(&dn); }); }),
        row("new_ldapDN_elem33", [] { return tell_made(new_ldapDN_elem33(), free_ldapDN_elem33); }),
        row("new_ldapRDN_elem33", [] { return tell_made(new_ldapRDN_elem33("cn", "a", SC_CIS), free_ldapRDN_elem33); }),
        row("replace_DN", "0 A=X", {"90 a=x"},
            [] {
                char* text = heap_copy("a=x");
                const int result = replace_DN(&text, 1);
                return tell(result, " ") + tell_freed(text);
            }),
        row("replace_DN, a text that isn't released", "0 0 a=x A=X", {"90 1 a=x "},
            [] {
                char text[] = "a=x";
                char* replaced = text;
                const int result = replace_DN(&replaced, 0);
                const bool same = replaced == text;
                return tell(result, " ", same, " ", text, " ") + (same ? calm_text("") : tell_freed(replaced));
            }),
        row("ParentDN33", "0 0 a=x A=X", [&] { return tell_dn(ParentDN33(parsed)); }),
        row("getParentDn", "a=x,", [&] { return tell_freed(getParentDn(parsed)); }),
        row("getParentDnUpper", "A=X", [&] { return tell_freed(getParentDnUpper(parsed)); }),
    });
    // Values that can't be resolved for want of memory are compared as they are.
    ldap_escDN* quoted = dn_normalize_esc("sn=\\\"b\\\"");
    ldap_escDN* plain = dn_normalize_esc("sn=b");
    ldap_escDN* other = dn_normalize_esc("sn=\\\"c\\\"");
    expect_outcomes({
        row("compare_ldapDN_elem33", "1", {"0", "1"},
            [&] { return tell(compare_ldapDN_elem33(quoted->rdns, plain->rdns)); }),
        row("compare_ldapRDN33", "1", {"0", "1"},
            [&] { return tell(compare_ldapRDN33(quoted->rdns->pairs->rdn, plain->rdns->pairs->rdn)); }),
        row("compare_ldap_escDN", "1", {"0", "1"}, [&] { return tell(compare_ldap_escDN(quoted, plain)); }),
        row("compare_ldap_escDN, others", "0", {"0"}, [&] { return tell(compare_ldap_escDN(quoted, other)); }),
    });
    EXPECT_EQ(ldcf_api_get_modify_attr_info_lock_g()->count, 0);
    for (ldap_escDN* dn : {parsed, quoted, plain, other}) {
        free_ldap_escDN(&dn);
    }
}

TEST_F(DnAlloc, TextsStayAsTheyWere)
{
    expect_outcomes({
        row("dn_normalize", "cn=a+sn=b,a=x", {two_pairs}, [] { return tell_changed(dn_normalize, two_pairs); }),
        row("dn_normalize_compound_RDN", "cn=a+sn=b,a=x", {two_pairs},
            [] { return tell_changed(dn_normalize_compound_RDN, two_pairs); }),
        row("dn_normalize_case", "CN=A+SN=B,A=X", {"SN=B+CN=A,A=X"},
            [] { return tell_changed(dn_normalize_case, two_pairs); }),
        row("dn_compare", "-44", {"-1", "-16", "-44"}, [] { return tell(dn_compare("CN=A+sn=b", two_pairs)); }),
        row("minAttrValue", "a,b", [] { return tell_freed(minAttrValue("\"a,b\"")); }),
        row("rdn_type_new", [] { return tell_made(rdn_type_new(), rdn_type_delete); }),
        row("rdn_list_new", [] { return tell_made(rdn_list_new(), rdn_list_delete); }),
        row("dn_list_new", [] { return tell_made(dn_list_new(), dn_list_delete); }),
        row("rdn_type_init", [] { return tell_made(rdn_type_init("cn=a"), rdn_type_delete); }),
    });
}

TEST_F(DnAlloc, SuffixesAndParents)
{
    char suffix[] = "A=X";
    char* suffixes[] = {suffix, nullptr};
    Backend be{.be_suffix = suffixes, .be_type = "rdbm"};
    expect_outcomes({
        row("dn_issuffix", "1", {"0"}, [] { return tell(dn_issuffix("cn=a,a=x", "A=X")); }),
        row("be_issuffix_internal", "1", {"90"}, [&] { return tell(be_issuffix_internal(&be, "a=x", 0)); }),
        row("dn_parent", "a=x", [&] { return tell_freed(dn_parent(&be, "cn=a,a=x")); }),
        row("dn_parent_norm", "A=X", [&] { return tell_freed(dn_parent_norm(&be, "CN=A,A=X")); }),
        row("dn_get_parent", "0 a=x", {"90 (null)"},
            [&] {
                char* parent = nullptr;
                const int result = dn_get_parent(&be, "cn=a,a=x", &parent);
                return tell(result, " ") + tell_freed(parent);
            }),
        row("dn_get_parent_norm", "0 A=X", {"90 (null)"},
            [&] {
                char* parent = nullptr;
                const int result = dn_get_parent_norm(&be, "CN=A,A=X", &parent, 1);
                return tell(result, " ") + tell_freed(parent);
            }),
    });
}

}  // namespace

#endif

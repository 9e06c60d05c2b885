// The checks of an entry on entries of any kind: every mode, with the password policy and without, the older check, and
// those of aliases and referrals.
//
// The input is a sequence of steps, each a byte and a value: names and values come out of tables, or from the input as
// they stand. A check gives one of the results that it may give, reports something when it refuses, and gives the same
// when it is asked again: what it has added is there then, and nothing else has changed.
#include <iterator>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "fuzz/support/fuzz_support.h"
#include "servers/vrnd/libdirbase/model/attribute.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"
#include "servers/vrnd/libdirbase/schema/ldcf_entry_check.h"
#include "servers/vrnd/libdirbase/schema/ldcf_oc_check.h"

namespace {

using fuzz_support::expect;
using kind = ldcf_entry_finding_kind;

constexpr char definitions[] = R"(
ldapSyntaxes { ( 1.3.6.1.4.1.1466.115.121.1.15 ) ( 1.3.6.1.4.1.1466.115.121.1.12 ) ( 1.3.6.1.4.1.1466.115.121.1.8 )
    ( 1.3.6.1.4.1.1466.115.121.1.7 ) }
attributeTypes { ( 2.5.4.0 NAME 'objectClass' SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 )
    ( 1.1 NAME ( 'cn' 'commonName' ) SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 )
    ( 1.2 NAME 'one' SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 SINGLE-VALUE )
    ( 1.3 NAME 'owner' SYNTAX 1.3.6.1.4.1.1466.115.121.1.12 ) ( 1.4 NAME 'cert' SYNTAX 1.3.6.1.4.1.1466.115.121.1.8 )
    ( 1.5 NAME 'flag' SYNTAX 1.3.6.1.4.1.1466.115.121.1.7 ) ( 1.6 NAME 'ref' SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 )
    ( 1.7 NAME 'aliasedObjectName' SYNTAX 1.3.6.1.4.1.1466.115.121.1.12 )
    ( 1.8 NAME 'locked' SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 )
    ( 2.1 NAME 'pwdChangedTime' SUP cn ) ( 2.2 NAME 'pwdAccountLockedTime' SUP cn )
    ( 2.3 NAME 'pwdExpirationWarned' SUP cn ) ( 2.4 NAME 'pwdReset' SUP cn ) ( 2.5 NAME 'pwdFailureTime' SUP cn )
    ( 2.6 NAME 'pwdHistory' SUP cn ) ( 2.7 NAME 'pwdGraceUseTime' SUP cn ) ( 2.8 NAME 'pwdGroupPoliceDN' SUP cn )
    ( 2.9 NAME 'pwdIndividualPolicyDN' SUP cn ) }
XANattributeTypes { ( 1.8 ACCESS-CLASS RESTRICTED ) }
objectClasses { ( 2.5.6.0 NAME 'top' ABSTRACT MUST objectClass )
    ( 3.1 NAME 'person' SUP top MUST cn MAY ( one $ owner $ cert $ flag ) ) ( 3.2 NAME 'worker' SUP person MUST one )
    ( 3.3 NAME 'mark' AUXILIARY MAY ( locked $ flag ) ) ( 3.4 NAME 'alias' SUP top MUST aliasedObjectName )
    ( 3.5 NAME 'aliasObject' AUXILIARY ) ( 3.6 NAME 'referral' SUP top MUST ref )
    ( 3.7 NAME 'extensibleObject' AUXILIARY ) }
)";

constexpr const char* names[] = {
    "objectClass", "cn",  "commonName;lang-en", "one",    "owner",   "cert;binary", "cert",      "flag",
    "ref",         "1.7", "aliasedEntryName",   "locked", "oid.1.2", "none",        "cn;binary", "pwdReset",
};
constexpr const char* values[] = {
    "top", "person", "worker", "mark", "alias", "aliasObject", "referral", "extensibleObject",
    "3.1", "none",   "cn=x",   "a",    "",
};

bool load_schema()
{
    ldcf_api_schema_init();
    ldcf_schema_g->parse_str(definitions, "fuzz");
    ldcf_schema_g->complete_nocheck();
    return ldcf_api_schema_complete_db_names() == 0;
}

// An entry built by the steps of an input.
class fuzzed_entry {
public:
    fuzzed_entry(const std::uint8_t* data, std::size_t size)
    {
        while (size > 1) {
            const std::uint8_t step = *data;
            const std::size_t taken = std::min<std::size_t>(size - 1, data[1] >> 4);
            const fuzz_support::exact_text raw(data + 2, size < 2 + taken ? size - 2 : taken);
            const bool raw_name = step >= 240;
            const char* name = raw_name ? raw.c_str() : names[step % std::size(names)];
            const std::size_t choice = (data[1] & 15);
            const bool raw_value = choice >= std::size(values);
            add(name, raw_value ? raw.c_str() : values[choice], step % 7 == 6);
            const std::size_t used = 2 + (raw_name || raw_value ? taken : 0);
            data += std::min(used, size);
            size -= std::min(used, size);
        }
    }
    ~fuzzed_entry()
    {
        while (entry_.e_attrs != nullptr) {
            attr_free(std::exchange(entry_.e_attrs, entry_.e_attrs->a_next));
        }
    }
    fuzzed_entry(const fuzzed_entry&) = delete;
    fuzzed_entry& operator=(const fuzzed_entry&) = delete;

    Entry* get() { return &entry_; }

    std::string text() const
    {
        std::string all;
        for (const Attribute* attr = entry_.e_attrs; attr != nullptr; attr = attr->a_next) {
            all += attr->a_type;
            for (std::int64_t i = 0; i < attr->a_numvals; ++i) {
                all += "\1" + std::string(attr->a_vals[i]->bv_val, attr->a_vals[i]->bv_len);
            }
            all += "\n";
        }
        return all;
    }

private:
    void add(const char* name, const char* text, bool is_dn)
    {
        if (is_dn) {
            dn_ = text;
            entry_.e_dn = dn_.data();
            return;
        }
        berval value = {std::char_traits<char>::length(text), const_cast<char*>(text)};
        berval* list[] = {&value, nullptr};
        attr_merge(&entry_, name, list, 0, 0, nullptr);  // a bad tag is refused, with nothing added
    }

    std::string dn_;
    Entry entry_ = {};
};

class collector final : public ldcf_entry_sink {
public:
    void report(const ldcf_entry_finding& finding) override
    {
        const bool is_fault = finding.kind < kind::top_added;
        (is_fault ? faults : additions)
            .insert({static_cast<int>(finding.kind), finding.name == nullptr ? "" : finding.name});
    }
    std::multiset<std::pair<int, std::string>> faults;
    std::multiset<std::pair<int, std::string>> additions;
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    static const bool loaded = load_schema();
    expect(loaded, "the schema is complete");

    for (const int mode : {1, 2, 3, 4, 5}) {
        for (const bool policy : {false, true}) {
            fuzzed_entry entry(data, size);
            const std::string before = entry.text();
            bool added = true;
            collector first;
            const int result = ldcf_check_entry(*ldcf_schema_g, entry.get(), mode, policy, &added, first);
            expect(std::set{0, 17, 21, 34, 65}.count(result) == 1, "the result is a known one");
            expect(result == 0 || !first.faults.empty(), "a refusal has its reason");
            expect(result != 0 || first.faults.empty() ||
                       first.faults.begin()->first == int(kind::structural_class_missing),
                   "a fault is refused, but for aliases and referrals");
            expect(added || entry.text() == before, "nothing changes unless something is added");

            collector second;
            bool added_again = true;
            expect(ldcf_check_entry(*ldcf_schema_g, entry.get(), mode, policy, &added_again, second) == result,
                   "the second check has the result of the first");
            expect(second.faults == first.faults && !added_again, "it finds the same, and adds nothing");

            ldcf_api_set_schema_check(mode);
            expect(ldcf_api_schema_check(entry.get(), nullptr, policy) == result, "the logs make no difference");
        }
    }
    const fuzzed_entry entry(data, size);
    fuzzed_entry checked(data, size);
    for (const int result : {check_aliasObject(checked.get()), check_referralObject(checked.get())}) {
        expect(result == 0 || result == 65, "aliases and referrals pass or not");
    }
    const int older = ldcf_oc_schema_check(checked.get());
    collector sink;
    expect(ldcf_check_entry(*ldcf_schema_g, checked.get(), 1, false, nullptr, sink) == older,
           "mode 1 is the older check");
    const fuzz_support::exact_text text(data, size);
    oc_check_required(checked.get(), text.c_str());
    oc_check_allowed(text.c_str(), checked.get()->e_attrs == nullptr ? nullptr : checked.get()->e_attrs->a_vals,
                     text.c_str());
    expect(oc_attr_type_cmp(text.c_str(), text.c_str()) == 0 ||
               ldcf_schema_g->attribute_types.find(text.c_str()) == ldcf_schema_g->attribute_types.end(),
           "a known name is itself");
    expect(checked.text() == entry.text(), "the older checks change nothing");
    return 0;
}

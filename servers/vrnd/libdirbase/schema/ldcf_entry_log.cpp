// The words of findings in the message log and the debug log: see ldcf_entry_finding.h.
#include "libraries/libmsg/debug_log.h"
#include "libraries/libmsg/message_log.h"
#include "servers/vrnd/libdirbase/schema/ldcf_entry_finding.h"

namespace {

enum message_id : int {
    message_no_objectclass = 7,
    message_attribute_missing = 8,
    message_attribute_not_allowed = 9,
    message_attribute_undefined = 13,
    message_class_undefined = 26,
};

template <typename... Arguments>
void tell(message_id id, const Arguments&... arguments)
{
    PrintMessage(MSG_COMPONENT_RDBM, MSG_SEVERE, id, arguments...);
}

class entry_log final : public ldcf_entry_sink {
public:
    void report(const ldcf_entry_finding& finding) override
    {
        using kind = ldcf_entry_finding_kind;
        const char* const name = finding.name;
        const char* const dn = finding.dn == nullptr ? "(null)" : finding.dn;
        const int count = static_cast<int>(finding.count);
        switch (finding.kind) {
        case kind::no_objectclass: tell(message_no_objectclass, finding.dn); break;
        case kind::policy_undefined:
            debug_error("Error - ldcf_api_schema_check: undefined pwdpolicy attribute %s\n", name);
            tell(message_attribute_undefined, name, finding.dn);
            break;
        case kind::attribute_undefined:
            debug_error("Error - ldcf_api_schema_check: undefined attribute %s in entry %s\n", name, dn);
            tell(message_attribute_undefined, name, finding.dn);
            break;
        case kind::single_value_exceeded:
            debug_error("Error - ldcf_api_schema_check: %s is single-valued attribute but has %d values in entry %s\n",
                        name, count, dn);
            break;
        case kind::class_undefined:
            debug_error("Error - ldcf_api_schema_check: objectclass %s is undefined for entry dn: %s\n", name, dn);
            tell(message_class_undefined, name);
            break;
        case kind::structural_class_missing:
            debug_error("Error - ldcf_api_schema_check: Structural objectclass is missing\n");
            break;
        case kind::structural_class_count:
            debug_error("Error - ldcf_api_schema_check: number of base structural objectclass values is %d, "
                        "must be 1.\n",
                        count);
            break;
        case kind::superclass_missing:
            debug_error("Error - ldcf_api_schema_check: super class %s is missing from entry %s\n", name, dn);
            break;
        case kind::attribute_missing: tell(message_attribute_missing, name, finding.dn); break;
        case kind::attribute_not_allowed: tell(message_attribute_not_allowed, name, finding.dn); break;
        case kind::attribute_unknown: debug_error("Attribute %s does not exist in the schema\n", name); break;
        case kind::alias_target_missing:
            debug_error("Attribute aliasedObjectName/aliasedEntryName is missing\n");
            break;
        case kind::alias_target_twice:
            debug_error("Cannot have both aliasedObjectName and aliasedEntryName attribute\n");
            break;
        case kind::alias_target_exceeded: debug_error("Too many aliasedObjectName. Only one is allowed\n"); break;
        case kind::referral_target_missing: debug_error("Attribute ref is missing\n"); break;
        case kind::top_added: debug_trace("ldcf_api_schema_check: top is missing from entry %s, will add\n", dn); break;
        case kind::superclass_added:
            debug_trace("ldcf_api_schema_check: super class %s is missing from entry %s and will be added\n", name, dn);
            break;
        case kind::mode_invalid:
            debug_error("Error - ldcf_api_schema_check: Invalid ldcf_api_schema_check_g value\n");
            break;
        case kind::entry_dn_invalid:
        case kind::value_dn_invalid:
        case kind::not_binary:
        case kind::class_unknown:
        case kind::boolean_exceeded: break;  // the result alone tells, and for DNs those who read them
        }
    }
};

}  // namespace

ldcf_entry_sink& ldcf_entry_log()
{
    static entry_log log;
    return log;
}

// The phases of a schema change: see ldcf_schema_modify.h.
#include "servers/vrnd/libdirbase/schema/ldcf_schema_modify.h"

#include "libraries/libmsg/debug_log.h"
#include "libraries/libmsg/message_log.h"
#include "servers/vrnd/libdirbase/schema/ldcf_schema_recover.h"

namespace {

// The active schema and the spare, by turns.
ldcf_schema schemas[2];

}  // namespace

ldcf_schema* ldcf_schema_g = &schemas[0];
ldcf_schema* ldcf_schema_proposed_g = nullptr;

namespace {

// True from a vote that went through until the commit or the cleanup: only then is there something to commit.
bool voted = false;

ldcf_schema& spare_schema()
{
    return ldcf_schema_g == &schemas[0] ? schemas[1] : schemas[0];
}

template <typename T>
void vote(ldcf_modify_op op, T& definition)
{
    voted = false;
    ldcf_schema& proposed = spare_schema();
    ldcf_schema_proposed_g = &proposed;
    proposed.clear();  // a change that was never cleaned up must not shine through
    if (ldcf_recovery leftovers(*ldcf_schema_g); leftovers.commit_interrupted()) {
        leftovers.run();  // nor what its commit left on disk, which the next commit would take for its own
    }
    proposed.copy(*ldcf_schema_g);
    switch (op) {
    case ldcf_modify_add: proposed.insert(definition); break;
    case ldcf_modify_delete: proposed.erase(definition); break;
    case ldcf_modify_replace: proposed.replace(definition); break;
    default:
        throw exc_invalid_parameter_t(
            __FILE__, __LINE__, "invalid op value; Expected one of the following operation: [p[add, delete, replace]p]",
            LDCF_MSG_INVALID_OPERATION);
    }
    proposed.check();
    proposed.flush();
    voted = true;
}

void commit()
{
    if (!voted) {
        throw exc_invalid_state_t(__FILE__, __LINE__, "exc_invalid_state", 0);
    }
    ldcf_schema_proposed_g->flush_commit();
    ldcf_schema_g = ldcf_schema_proposed_g;
    voted = false;
}

void cleanup()
{
    struct empty_spare {
        ~empty_spare() { spare_schema().clear(); }
    } whatever_happens;
    voted = false;

    if (ldcf_schema_proposed_g != nullptr && ldcf_schema_proposed_g != ldcf_schema_g) {
        ldcf_schema_proposed_g->flush_rollback();
    }
}

template <typename T>
int ldcf_schema_modify(ldcf_modify_op op, ldcf_modify_phase phase, T& definition)
{
    switch (phase) {
    case ldcf_modify_vote: vote(op, definition); return 0;
    case ldcf_modify_commit: commit(); return 0;
    case ldcf_modify_rollback: return 0;
    case ldcf_modify_cleanup: cleanup(); return 0;
    }
    debug_error("invalid phase value(%d)", phase);
    return -1;
}

// How the values of an attribute are protected.
struct protection {
    int encryption = 16;  // no method's number, so that any method differs from that of a type that isn't there
    int return_value = 0;
    bool secure_connection = false;
    bool non_matchable = false;

    protection() = default;
    explicit protection(const ldcf_attrtype_& attribute)
        : encryption(static_cast<int>(attribute.encryption())),
          return_value(static_cast<int>(attribute.return_value())),
          secure_connection(attribute.secure_connection()),
          non_matchable(attribute.non_matchable())
    {
    }
    bool operator==(const protection&) const = default;
};

const char* encryption_text(int encryption)
{
    switch (static_cast<ldcf_encryption>(encryption)) {
    case ldcf_encryption::ssha: return "ENCRYPT=SSHA ";
    case ldcf_encryption::aes_256: return "ENCRYPT=AES-256 ";
    case ldcf_encryption::aes_192: return "ENCRYPT=AES-192 ";
    case ldcf_encryption::aes_128: return "ENCRYPT=AES-128 ";
    default: return "ENCRYPT=none ";
    }
}

const char* return_value_text(int return_value)
{
    switch (static_cast<ldcf_return_value>(return_value)) {
    case ldcf_return_value::encrypted: return "RETURN-VALUE=encrypted ";
    case ldcf_return_value::type_only: return "RETURN-VALUE=type-only ";
    default: return "RETURN-VALUE=cleartext ";
    }
}

// What has changed, told by the new values.
csgl_string describe_change(const protection& before, const protection& after)
{
    csgl_string text("");
    if (before.encryption != after.encryption) {
        text.append(encryption_text(after.encryption));
    }
    if (before.return_value != after.return_value) {
        text.append(return_value_text(after.return_value));
    }
    if (before.secure_connection != after.secure_connection) {
        text.append(after.secure_connection ? "SECURE-CONNECTION-REQUIRED=true " : "SECURE-CONNECTION-REQUIRED=false ");
    }
    if (before.non_matchable != after.non_matchable) {
        text.append(after.non_matchable ? "NONMATCHABLE=true " : "NONMATCHABLE=false ");
    }
    return text;
}

}  // namespace

int ldcf_schema_modify_syntax(Backend* /*be*/, ldcf_modify_op op, ldcf_modify_phase phase, ldcf_syntax& definition)
{
    return ldcf_schema_modify(op, phase, definition);
}

int ldcf_schema_modify_matchrule(Backend* /*be*/, ldcf_modify_op op, ldcf_modify_phase phase,
                                 ldcf_matchrule& definition)
{
    return ldcf_schema_modify(op, phase, definition);
}

int ldcf_schema_modify_attrtype(Backend* /*be*/, ldcf_modify_op op, ldcf_modify_phase phase, ldcf_attrtype& definition)
{
    protection before;
    protection after;
    if (phase == ldcf_modify_commit) {
        after = protection(*definition);
        const ldcf_attrtype active = ldcf_find(ldcf_schema_g->attribute_types, definition.name());
        before = active ? protection(*active) : protection();
    }
    const bool counts = op == ldcf_modify_replace && !(before == after);

    const int result = ldcf_schema_modify(op, phase, definition);
    if (result == 0 && counts) {
        const csgl_string text = describe_change(before, after);
        PrintMessage(MSG_COMPONENT_SCHEMA, MSG_WARNING, LDCF_MSG_PROTECTION_CHANGED, definition.name().c_str(),
                     text.c_str());
    }
    return result;
}

int ldcf_schema_modify_objclass(Backend* /*be*/, ldcf_modify_op op, ldcf_modify_phase phase, ldcf_objclass& definition)
{
    return ldcf_schema_modify(op, phase, definition);
}

// From the text of a DN to its chain: see dn_esc.h.
//
// Each element is scanned once. A value without quotes and escapes, which most are, goes to its pair and to the working
// text by plain copies, and what is written is measured then and never again.
#include <cstdlib>
#include <cstring>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "libraries/libmsg/message_log.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/model/attr_lookup.h"
#include "servers/vrnd/libdirbase/model/dn_chars.h"
#include "servers/vrnd/libdirbase/model/dn_esc_records.h"
#include "servers/vrnd/libdirbase/model/dn_scan.h"
#include "servers/vrnd/libdirbase/model/dn_sort.h"

using dn_chars::is;

namespace {

// Gives a scanned element to a caller who counts from the last character.
const char* give(const dn_element& element, const char** start, const char** last, int* error)
{
    *start = element.first;
    *error = element.error;
    if (element.error == 0) {
        *last = element.end - 1;
    }
    return element.next;
}

void sort_pairs(ldapDN_elem33& rdn)
{
    if (rdn.count < 2) {
        return;
    }
    rdn.pairs = sort_chain(rdn.pairs, esc_pair_less);
    for (rdn.last = rdn.pairs; rdn.last->next != nullptr; rdn.last = rdn.last->next) {}
}

// The working text.
class work_writer {
public:
    explicit work_writer(ldap_escDN_work& work) : work_(work) {}

    // Makes room for so many bytes and a terminator. False without memory.
    bool reserve(std::size_t more)
    {
        if (work_.room > work_.length && more < work_.room - work_.length) {
            return true;
        }
        constexpr std::size_t some_names = 512;  // where one name is long, others may be: once is enough for most DNs
        const std::size_t room = work_.length + more + work_.room + some_names;
        void* moved = std::realloc(*work_.dn, sizeof(ldap_escDN) + room);
        if (moved == nullptr) {
            return false;
        }
        *work_.dn = static_cast<ldap_escDN*>(moved);
        (*work_.dn)->scratch = reinterpret_cast<char*>(*work_.dn + 1);
        work_.room = room;
        return true;
    }

    char* at() { return (*work_.dn)->scratch + work_.length; }

    // What is written, there must be room for.
    void add(const char* text, std::size_t length)
    {
        std::memcpy(at(), text, length);
        move_to(at() + length);
    }
    void add(char c) { add(&c, 1); }
    void move_to(char* end)
    {
        work_.length = static_cast<std::size_t>(end - (*work_.dn)->scratch);
        *end = '\0';
    }
    void take_back(std::size_t length) { move_to(at() - length); }

private:
    ldap_escDN_work& work_;
};

// The parse of one RDN.
class rdn_parser {
public:
    rdn_parser(ldapDN_elem33& rdn, ldap_escDN_work& work, bool schema) : rdn_(rdn), work_(work), schema_(schema) {}

    // Parses a pair and returns the position behind it, or of the fault.
    const char* parse_pair(const char* text)
    {
        const dn_element type = scan_type(text, dn_form::structured);
        if (type.error != 0) {
            return fail(type.error, type.next);
        }
        if (!take_type(type)) {
            return type.first;
        }
        const dn_element value = scan_value(type.next + 1, dn_form::structured);
        if (value.error != 0) {
            return fail(value.error, value.next);
        }
        return take_value(value) ? value.next : value.first;
    }

    int error() const { return error_; }

private:
    const char* fail(int error, const char* at)
    {
        error_ = error;
        return at;
    }
    bool fail(int error)
    {
        error_ = error;
        return false;
    }

    // Writes the type to the working text, from where it is looked up.
    bool take_type(const dn_element& type)
    {
        const auto length = static_cast<std::size_t>(type.end - type.first);
        if (!work_.reserve(length + 1)) {
            return fail(DN_ERR_NO_MEMORY);
        }
        const char* const written = work_.at();
        work_.add(type.first, length);
        name_ = type.first;
        name_length_ = length;
        syntax_ = 1;
        if (schema_ && !look_up(written, type.numeric)) {
            return false;
        }
        work_.add('=');
        return true;
    }

    bool look_up(const char* written, bool numeric)
    {
        asyntaxinfo* info = nullptr;
        if (look_up_attr(written, &info) != LDAP_SUCCESS) {
            return fail(DN_ERR_NO_MEMORY);
        }
        name_ = info == nullptr ? nullptr : info->names[0];
        if (name_ == nullptr) {
            debug_error("attribute %s is not defined in the schema\n", written);
            PrintMessage(MSG_COMPONENT_RDBM, MSG_SEVERE, 13, written);
            return fail(DN_ERR_UNDEFINED);
        }
        const std::size_t written_length = name_length_;
        name_length_ = info->name_length != 0 ? static_cast<std::size_t>(info->name_length) : std::strlen(name_);
        syntax_ = info->syntax;
        rdn_.syntax_mask &= info->syntax;
        if (info->encryption != 1) {
            rdn_.encrypted = 1;
        }
        if (numeric && (is(*written, dn_chars::digit) || std::strncmp(written, "oid.", 4) == 0)) {
            work_.take_back(written_length);
            if (!work_.reserve(name_length_ + 1)) {
                return fail(DN_ERR_NO_MEMORY);
            }
            work_.add(name_, name_length_);
        }
        return true;
    }

    // Makes the pair, with its value in bare form, and writes the value to the working text.
    bool take_value(const dn_element& value)
    {
        const auto room = static_cast<std::size_t>(value.end - value.first);
        esc_pair_guard pair = make_esc_pair(name_, name_length_, room, syntax_);
        if (pair == nullptr) {
            return fail(DN_ERR_NO_MEMORY);
        }
        ldapRDN_struct33& rdn = *pair->rdn;
        if (value.bare) {
            std::memcpy(rdn.value, value.first, room);
            rdn.value_length = rdn.escaped_length = room;
        } else {
            const dn_resolved bare = resolve_value(value.first, value.end, rdn.value, dn_form::structured);
            if (bare.error != 0) {
                return fail(bare.error);
            }
            rdn.value_length = bare.length;
            rdn.escaped_length = escaped_length_of(rdn.value, bare.length);
        }
        rdn.value[rdn.value_length] = '\0';
        if (!work_.reserve(rdn.escaped_length + 1)) {
            return fail(DN_ERR_NO_MEMORY);
        }
        char* end = write_escaped(work_.at(), rdn);
        *end = '+';
        work_.move_to(end + 1);
        insert_ldapRDN_elem33(&rdn_, pair.release(), dn_order_given);
        return true;
    }

    ldapDN_elem33& rdn_;
    work_writer work_;
    bool schema_;
    int error_ = 0;

    const char* name_ = nullptr;  // of the pair
    std::size_t name_length_ = 0;
    std::int64_t syntax_ = 1;
};

// Parses all RDNs of a text into a record whose work area is `room` bytes, and returns the error. The record may move.
int parse_rdns(const char* text, ldap_escDN*& dn, std::size_t room, int order, int schema)
{
    ldap_escDN_work work{&dn, 0, room};
    for (const char* at = text; *at != '\0';) {
        escRDN_guard rdn(new_ldapDN_elem33());
        if (rdn == nullptr) {
            return DN_ERR_NO_MEMORY;
        }
        int error = 0;
        at = parse_escRDN(at, rdn.get(), &work, order, schema, &error);
        if (error != 0) {
            return error;
        }
        dn->all_case_ignore &= rdn->syntax_mask;
        dn->scratch[work.length - 1] = ',';
        insert_ldapDN_elem33(dn, rdn.release());
        if (*at != '\0') {
            ++at;
        }
    }
    char* const end = dn->scratch + work.length - 1;
    *end = '\0';
    const bool written_so = end[-1] == '=' && end[-2] != '\\';
    return written_so || dn->last->last->rdn->value_length == 0 ? DN_ERR_EMPTY_VALUE : 0;
}

ldap_escDN* normalize(const char* text, int schema)
{
    older_dn_processing();  // asked for by the first call, whether or not its text depends on it
    ldap_escDN* dn = parse_escDN(text, dn_order_sorted, schema);
    if (dn != nullptr) {
        getRC(dn);
    }
    return dn;
}

}  // namespace

extern "C" {

ldap_escDN* dn_normalize_esc(const char* dn)
{
    return normalize(dn, 1);
}

ldap_escDN* dn_normalize_light_esc(const char* dn)
{
    return normalize(dn, 0);
}

ldap_escDN* parse_escDN(const char* dn, int order, int schema)
{
    if (dn == nullptr) {
        return nullptr;
    }
    const char* const text = dn + std::strspn(dn, " \n\r");
    const std::size_t length = static_cast<std::size_t>(text - dn) + std::strlen(text);
    const bool parsed = *text != '\0' && length <= dn_longest;
    const std::size_t room = parsed ? 2 * length + 2 : 1;
    ldap_escDN* record = new_ldap_escDN(room);
    if (record == nullptr) {
        return nullptr;
    }
    if (*text != '\0') {
        record->length = static_cast<std::int64_t>(length);
    }
    if (*text != '\0' && !parsed) {
        record->internal_error = DN_ERR_TOO_LONG;
        return record;
    }
    if (parsed) {
        const int error = parse_rdns(text, record, room, order, schema);
        record->internal_error = error;
        if (error != 0) {
            *record->scratch = '\0';
        }
    }
    BuildDNString33(record);
    return record;
}

const char* parse_escRDN(const char* text, ldapDN_elem33* rdn, ldap_escDN_work* work, int order, int schema, int* error)
{
    rdn_parser parser(*rdn, *work, schema != 0);
    const char* at = parser.parse_pair(text);
    while (parser.error() == 0 && *at == '+') {
        at = parser.parse_pair(at + 1);
    }
    *error = parser.error();
    if (order == dn_order_sorted) {
        sort_pairs(*rdn);
    }
    return at;
}

const char* find_end_attr_type33(const char** start, const char** last, int* error)
{
    return give(scan_type(*start, dn_form::structured), start, last, error);
}

const char* find_end_attr_value33(const char** start, const char** last, int* error)
{
    return give(scan_value(*start, dn_form::structured), start, last, error);
}

char* normAttrValue(const char* value, int* error)
{
    const std::size_t length = std::strlen(value);
    heap_text bare(static_cast<char*>(std::malloc(length + 1)));
    if (bare == nullptr) {
        *error = DN_ERR_NO_MEMORY;
        return nullptr;
    }
    const dn_resolved done = resolve_value(value, value + length, bare.get(), dn_form::structured);
    *error = done.error;
    if (done.error != 0) {
        return nullptr;
    }
    bare.get()[done.length] = '\0';
    return bare.release();
}

const char* FirstRDNType_and_syntax(const char* type, asyntaxinfo** info)
{
    *info = ldcf_api_attr_get_info(type, nullptr);
    return *info == nullptr ? nullptr : (*info)->names[0];
}

int needsEscape(char c)
{
    return is(c, dn_chars::special) || (c == '#' && older_dn_processing()) ? 1 : 0;
}

int canEscape(char c)
{
    return is(c, dn_chars::special | dn_chars::hash) || c == ' ' ? 1 : 0;
}

int getRC(ldap_escDN* dn)
{
    if (dn == nullptr) {
        return LDAP_INVALID_DN_SYNTAX;
    }
    switch (dn->internal_error) {
    case 0: dn->result = LDAP_SUCCESS; break;
    case DN_ERR_UNDEFINED: dn->result = LDAP_UNDEFINED_TYPE; break;
    case DN_ERR_NO_MEMORY: dn->result = LDAP_NO_MEMORY; break;
    default: dn->result = LDAP_INVALID_DN_SYNTAX; break;
    }
    return dn->result;
}

}  // extern "C"

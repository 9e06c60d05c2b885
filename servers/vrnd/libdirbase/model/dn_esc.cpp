// The records of a structured DN, their comparison, and parents: see dn_esc.h.
#include "servers/vrnd/libdirbase/model/dn_esc.h"

#include <cstdlib>
#include <cstring>
#include <new>
#include <utility>

#include "libraries/libber/ldap_result.h"
#include "libraries/libvrnutil/vrn_text.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/locking/rdbm_lock.h"
#include "servers/vrnd/libdirbase/model/dn_esc_records.h"
#include "servers/vrnd/libdirbase/model/dn_scan.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"

namespace {

esc_pair_guard copy_pair(const ldapRDN_struct33& from)
{
    esc_pair_guard copy = make_esc_pair(from.type, from.type_length, from.value_length, from.syntax);
    if (copy != nullptr) {
        std::memcpy(copy->rdn->value, from.value, from.value_length + 1);
        copy->rdn->value_length = from.value_length;
        copy->rdn->escaped_length = from.escaped_length;
    }
    return copy;
}

// A value resolved once more; null when there is no such form of the whole value.
heap_text resolved_again(const ldapRDN_struct33& pair)
{
    heap_text text(static_cast<char*>(std::malloc(pair.value_length + 1)));
    if (text != nullptr) {
        const char* const end = pair.value + pair.value_length;
        const dn_resolved done = resolve_value(pair.value, end, text.get(), dn_form::structured);
        text.get()[done.length] = '\0';
        if (done.error != 0 || done.next != end) {
            text.reset();
        }
    }
    return text;
}

bool equal_values(const ldapRDN_struct33& a, const ldapRDN_struct33& b)
{
    if (vrn_strcasecmp(a.value, b.value) == 0) {
        return true;
    }
    const heap_text resolved_a = resolved_again(a);
    const heap_text resolved_b = resolved_again(b);
    return vrn_strcasecmp(resolved_a == nullptr ? a.value : resolved_a.get(),
                          resolved_b == nullptr ? b.value : resolved_b.get()) == 0;
}

}  // namespace

esc_pair_guard make_esc_pair(const char* type, std::size_t type_length, std::size_t value_room, std::int64_t syntax)
{
    struct block {
        ldapRDN_elem33 link;
        ldapRDN_struct33 pair;
    };
    void* const memory = std::malloc(sizeof(block) + type_length + 1 + value_room + 1);
    if (memory == nullptr) {
        return nullptr;
    }
    auto* const made = new (memory) block;
    char* const texts = reinterpret_cast<char*>(made + 1);
    std::memcpy(texts, type, type_length);
    texts[type_length] = '\0';
    made->pair = {texts, texts + type_length + 1, syntax, type_length, 0, 0};
    made->link = {&made->pair, nullptr};
    return esc_pair_guard(&made->link);
}

extern "C" {

// ---- records and their chains ---------------------------------------------------------------------------------------

ldap_escDN* new_ldap_escDN(std::size_t work)
{
    void* const memory = std::malloc(sizeof(ldap_escDN) + (work == 0 ? 1 : work));
    if (memory == nullptr) {
        return nullptr;
    }
    auto* const dn = new (memory) ldap_escDN{};
    dn->all_case_ignore = 1;
    dn->scratch = reinterpret_cast<char*>(dn + 1);
    *dn->scratch = '\0';
    return dn;
}

ldapDN_elem33* new_ldapDN_elem33(void)
{
    void* const memory = std::malloc(sizeof(ldapDN_elem33));
    if (memory == nullptr) {
        return nullptr;
    }
    auto* const rdn = new (memory) ldapDN_elem33{};
    rdn->syntax_mask = 1;
    return rdn;
}

ldapRDN_elem33* new_ldapRDN_elem33(const char* type, const char* value, std::int64_t syntax)
{
    const std::size_t length = std::strlen(value);
    esc_pair_guard pair = make_esc_pair(type, std::strlen(type), length, syntax);
    if (pair != nullptr) {
        std::memcpy(pair->rdn->value, value, length + 1);
        pair->rdn->value_length = length;
        pair->rdn->escaped_length = escaped_length_of(value, length);
    }
    return pair.release();
}

void free_ldap_escDN(ldap_escDN** dn)
{
    if (dn == nullptr || *dn == nullptr) {
        return;
    }
    for (ldapDN_elem33* rdn = (*dn)->rdns; rdn != nullptr;) {
        free_ldapDN_elem33(std::exchange(rdn, rdn->next));
    }
    std::free((*dn)->canonical);
    std::free((*dn)->upper);
    std::free(std::exchange(*dn, nullptr));
}

void free_ldapDN_elem33(ldapDN_elem33* rdn)
{
    if (rdn == nullptr) {
        return;
    }
    for (ldapRDN_elem33* pair = rdn->pairs; pair != nullptr;) {
        free_ldapRDN_elem33(std::exchange(pair, pair->next));
    }
    std::free(rdn);
}

void free_ldapRDN_elem33(ldapRDN_elem33* pair)
{
    std::free(pair);
}

void insert_ldapRDN_elem33(ldapDN_elem33* rdn, ldapRDN_elem33* pair, int order)
{
    ldapRDN_elem33** place = rdn->last == nullptr ? &rdn->pairs : &rdn->last->next;
    if (order == dn_order_sorted) {
        for (place = &rdn->pairs; *place != nullptr && !esc_pair_less(*pair, **place); place = &(*place)->next) {}
    }
    pair->next = *place;
    *place = pair;
    if (pair->next == nullptr) {
        rdn->last = pair;
    }
    ++rdn->count;
}

void insert_ldapDN_elem33(ldap_escDN* dn, ldapDN_elem33* rdn)
{
    (dn->last == nullptr ? dn->rdns : dn->last->next) = rdn;
    rdn->next = nullptr;
    dn->last = rdn;
    ++dn->count;
}

ldapDN_elem33* copy_ldapDN_elem33(const ldapDN_elem33* rdn)
{
    escRDN_guard copy(rdn == nullptr ? nullptr : new_ldapDN_elem33());
    if (copy == nullptr) {
        return nullptr;
    }
    copy->syntax_mask = rdn->syntax_mask;
    copy->encrypted = rdn->encrypted;
    for (const ldapRDN_elem33* pair = rdn->pairs; pair != nullptr; pair = pair->next) {
        esc_pair_guard pair_copy = copy_pair(*pair->rdn);
        if (pair_copy == nullptr) {
            return nullptr;
        }
        insert_ldapRDN_elem33(copy.get(), pair_copy.release(), dn_order_given);
    }
    return copy.release();
}

// ---- comparison -----------------------------------------------------------------------------------------------------

int compare_ldap_escDN(const ldap_escDN* a, const ldap_escDN* b)
{
    if (a == nullptr || b == nullptr || a->internal_error != 0 || b->internal_error != 0 || a->count != b->count) {
        return 0;
    }
    const ldapDN_elem33* other = b->rdns;
    for (const ldapDN_elem33* rdn = a->rdns; rdn != nullptr; rdn = rdn->next, other = other->next) {
        if (compare_ldapDN_elem33(rdn, other) == 0) {
            return 0;
        }
    }
    return 1;
}

int compare_ldapDN_elem33(const ldapDN_elem33* a, const ldapDN_elem33* b)
{
    if (a->count != b->count) {
        return 0;
    }
    const ldapRDN_elem33* other = b->pairs;
    for (const ldapRDN_elem33* pair = a->pairs; pair != nullptr; pair = pair->next, other = other->next) {
        if (compare_ldapRDN33(pair->rdn, other->rdn) == 0) {
            return 0;
        }
    }
    return 1;
}

int compare_ldapRDN33(const ldapRDN_struct33* a, const ldapRDN_struct33* b)
{
    return vrn_strcasecmp(a->type, b->type) == 0 && equal_values(*a, *b) ? 1 : 0;
}

// ---- parents --------------------------------------------------------------------------------------------------------

ldap_escDN* ParentDN33(const ldap_escDN* dn)
{
    escDN_guard parent(dn == nullptr || dn->count < 2 ? nullptr : new_ldap_escDN(1));
    if (parent == nullptr) {
        return nullptr;
    }
    for (const ldapDN_elem33* rdn = dn->rdns->next; rdn != nullptr; rdn = rdn->next) {
        ldapDN_elem33* copy = copy_ldapDN_elem33(rdn);
        if (copy == nullptr) {
            return nullptr;
        }
        insert_ldapDN_elem33(parent.get(), copy);
        parent->all_case_ignore &= copy->syntax_mask;
    }
    parent->length = dn->length;
    parent->internal_error = dn->internal_error;
    parent->result = dn->result;
    return BuildDNString33(parent.get()) == nullptr ? nullptr : parent.release();
}

char* getParentDn(const ldap_escDN* dn)
{
    if (dn == nullptr || dn->internal_error != 0 || dn->count < 2) {
        return nullptr;
    }
    std::size_t length = 0;
    const auto for_each_pair = [dn](auto&& function) {
        for (const ldapDN_elem33* rdn = dn->rdns->next; rdn != nullptr; rdn = rdn->next) {
            for (const ldapRDN_elem33* pair = rdn->pairs; pair != nullptr; pair = pair->next) {
                function(*pair->rdn, pair->next == nullptr ? ',' : '+');
            }
        }
    };
    for_each_pair([&](const ldapRDN_struct33& pair, char) { length += pair.type_length + pair.value_length + 2; });
    heap_text text(static_cast<char*>(std::malloc(length + 1)));
    if (text == nullptr) {
        return nullptr;
    }
    char* out = text.get();
    for_each_pair([&](const ldapRDN_struct33& pair, char separator) {
        out = static_cast<char*>(std::memcpy(out, pair.type, pair.type_length)) + pair.type_length;
        *out++ = '=';
        out = static_cast<char*>(std::memcpy(out, pair.value, pair.value_length)) + pair.value_length;
        *out++ = separator;
    });
    *out = '\0';
    return text.release();
}

// The parent is normalised from its canonical text: with bare values, as getParentDn has them, a separator inside a
// value would make another DN of it.
char* getParentDnUpper(const ldap_escDN* dn)
{
    const escDN_guard parent(ParentDN33(dn));
    if (parent == nullptr || parent->internal_error != 0) {
        return nullptr;
    }
    rdbm_lock_t* const lock = ldcf_api_get_modify_attr_info_lock_g();
    _rdbm_rd_lock(lock);
    const escDN_guard normal(dn_normalize_esc(parent->canonical));
    _rdbm_rd_unlock(lock);
    return normal == nullptr || normal->result != LDAP_SUCCESS ? nullptr : std::exchange(normal->upper, nullptr);
}

int replace_DN(char** dn, int release)
{
    const escDN_guard normal(dn_normalize_esc(*dn));
    if (normal == nullptr) {
        return LDAP_NO_MEMORY;
    }
    if (normal->result != LDAP_SUCCESS || std::strcmp(normal->upper, *dn) == 0) {
        return normal->result;
    }
    if (release != 0) {
        std::free(*dn);
    }
    *dn = std::exchange(normal->upper, nullptr);
    return LDAP_SUCCESS;
}

}  // extern "C"

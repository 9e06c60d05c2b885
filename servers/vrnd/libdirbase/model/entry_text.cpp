// Writing entries as text, and the global buffer: see entry_text.h.
//
// Room is made by the worst case of a line, but that is only worked out when a plainly sufficient one isn't there.
#include "servers/vrnd/libdirbase/model/entry_text.h"

#include <pthread.h>

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <mutex>
#include <string_view>

#include "libraries/libber/ldap_result.h"
#include "libraries/libldif/line64.h"
#include "libraries/libldif/line_write.h"
#include "libraries/libmsg/debug_log.h"
#include "libraries/libmsg/message_log.h"
#include "libraries/libvrnutil/vrn_text.h"
#include "servers/vrnd/libdirbase/model/attr_ids.h"
#include "servers/vrnd/libdirbase/model/attr_records.h"
#include "servers/vrnd/libdirbase/model/attribute.h"

namespace {

constexpr std::size_t growth_step = 1024;
constexpr std::size_t id_room = sizeof "-2147483648\n";
constexpr std::string_view all_members = "CN=NULL";
constexpr std::string_view masked_value = "*";
constexpr std::int32_t return_type_only = 2;  // of asyntaxinfo

pthread_mutex_t entry2str_mutex;
std::once_flag entry2str_mutex_made;

// What a form of the text does in its own way.
struct text_form {
    bool with_id;
    bool mask_type_only;
    bool trim_members;
    bool leave_out_password_state;
    const char* writer;  // for the debug log
};

// MAKE_SPACE without a word about a failure.
bool make_space(std::size_t needed, char** buffer, char** cursor, std::size_t* size)
{
    const std::size_t used = *buffer == nullptr ? 0 : static_cast<std::size_t>(*cursor - *buffer);
    const std::size_t step = needed <= growth_step ? growth_step : needed / growth_step * growth_step + growth_step;
    std::size_t grown = *buffer == nullptr ? 0 : *size;
    while (grown == 0 || grown < used + needed) {
        grown += step;
    }
    if (*buffer != nullptr && grown == *size) {
        return true;
    }
    auto* block = static_cast<char*>(std::realloc(*buffer, grown));
    if (block == nullptr) {
        return false;
    }
    *buffer = block;
    *cursor = block + used;
    *size = grown;
    return true;
}

// A growing buffer that a caller owns.
class text_buffer {
public:
    text_buffer(char** start, char** cursor, std::size_t* size) : start_(*start), cursor_(*cursor), size_(*size)
    {
        if (start_ == nullptr) {
            size_ = 0;
        }
        cursor_ = start_;
        take_over();
    }

    bool make_room(std::size_t needed) { return needed <= left() || grow(needed); }

    bool write_line(const char* type, std::size_t type_length, std::string_view value)
    {
        if (plenty(type_length, value.size()) > left() && !make_room(ldif_line_room(type_length, value.size()))) {
            return false;
        }
        at_ = ldif_write_line(at_, type, type_length, value.data(), value.size());
        return true;
    }

    // Writes a line for each value. The position is kept out of memory, which what is written might change for all that
    // the compiler knows.
    bool write_lines(const named_attribute& attr, berval** values)
    {
        const char* const name = attr.attribute.a_type;
        const std::size_t name_length = attr.type_length;
        const std::size_t plenty_without_value = plenty(name_length, 0);
        char* at = at_;
        char* end = end_;
        for (; *values != nullptr; ++values) {
            const char* const bytes = (*values)->bv_val;
            const std::size_t length = bytes == nullptr ? 0 : (*values)->bv_len;
            if (plenty_without_value + 2 * length > static_cast<std::size_t>(end - at)) {
                at_ = at;
                if (!write_line(name, name_length, {bytes, length})) {
                    return false;
                }
                at = at_;
                end = end_;
                continue;
            }
            // NOLINTNEXTLINE(clang-analyzer-core.NonNullParamChecker): there is room, so there is a buffer
            std::memcpy(at, name, named_attribute::unit);
            if (name_length > named_attribute::unit) {
                std::memcpy(at + named_attribute::unit, name + named_attribute::unit,
                            name_length - named_attribute::unit);
            }
            at = ldif_write_value(ldif_write_colon(at + name_length), name_length + 2, bytes, length);
        }
        at_ = at;
        return true;
    }

    bool write_dn(std::string_view dn)
    {
        if (plenty(2, dn.size()) > left() && !make_room(ldif_line_room(2, dn.size()))) {
            return false;
        }
        // NOLINTNEXTLINE(clang-analyzer-core.NonNullParamChecker): there is room, so there is a buffer
        std::memcpy(at_, "dn: ", 4);
        at_ = ldif_write_value(at_ + 4, 4, dn.data(), dn.size());
        return true;
    }

    bool write_id(std::int32_t id, const char* writer)
    {
        if (!make_room(id_room)) {
            return false;
        }
        const std::size_t room = left();
        const int length = vrn_snprintf(at_, room, "%ld\n", static_cast<long>(id));
        if (length < 0 || static_cast<std::size_t>(length) >= room) {
            debug_error("Error - %s: vrn_snprintf failed rc=%d size=%ld\n", writer, length, static_cast<long>(room));
            return true;
        }
        at_ += length;
        return true;
    }

    // Returns the length of the text.
    bool terminate(std::size_t* length)
    {
        if (!make_room(1)) {
            return false;
        }
        *at_ = '\0';
        if (length != nullptr) {
            *length = static_cast<std::size_t>(at_ - start_);
        }
        cursor_ = at_;
        return true;
    }

private:
    // More than the room of any line with a type of whole units, and quickly worked out.
    static std::size_t plenty(std::size_t type_length, std::size_t length)
    {
        return 2 * (type_length + length) + 2 * named_attribute::unit;
    }

    std::size_t left() const { return static_cast<std::size_t>(end_ - at_); }

    void take_over()
    {
        at_ = cursor_;
        end_ = start_ + size_;
    }

    // More than is needed, in proportion, or a text of many megabytes would be moved for each kilobyte of it.
    bool grow(std::size_t needed)
    {
        cursor_ = at_;
        int error = LDAP_SUCCESS;
        const std::size_t generous = std::max(needed, static_cast<std::size_t>(at_ - start_) / 2);
        if (!make_space(generous, &start_, &cursor_, &size_)) {
            MAKE_SPACE(needed, &error, &start_, &cursor_, &size_);
        }
        take_over();
        return error == LDAP_SUCCESS;
    }

    char*& start_;
    char*& cursor_;
    std::size_t& size_;
    char* at_ = nullptr;
    char* end_ = nullptr;
};

std::size_t length_of_type(const Attribute& attr)
{
    return static_cast<std::size_t>(strchrnul(attr.a_type, ':') - attr.a_type);
}

bool is_member(const Attribute& attr)
{
    return attr.a_info != nullptr &&
           (attr.a_info->attr_id == attr_id_member || attr.a_info->attr_id == attr_id_uniquemember);
}

bool is_password_state(std::int32_t id)
{
    switch (id) {
    case attr_id_pwdchangedtime:
    case attr_id_pwdaccountlockedtime:
    case attr_id_pwdexpirationwarned:
    case attr_id_pwdfailuretime:
    case attr_id_pwdhistory:
    case attr_id_pwdgraceusetime:
    case attr_id_pwdreset:
    case attr_id_xan_pwdaccountlocked:
    case attr_id_xan_pwdgrouppolicydn:
    case attr_id_xan_pwdindividualpolicydn: return true;
    default: return false;
    }
}

// What the form has a rule of its own for, as it has for some attributes.
bool is_special(const Attribute& attr, const text_form& form)
{
    const asyntaxinfo* const info = attr.a_info;
    return (form.leave_out_password_state && (info == nullptr || is_password_state(info->attr_id))) ||
           (form.trim_members && is_member(attr)) ||
           (form.mask_type_only && info != nullptr && info->return_value == return_type_only);
}

bool write_special(text_buffer& text, const Attribute& attr, const text_form& form)
{
    if (form.leave_out_password_state && !is_member(attr)) {
        return true;
    }
    const std::size_t type_length = length_of_type(attr);
    if (form.trim_members) {
        return text.write_line(attr.a_type, type_length, all_members);
    }
    bool written = true;
    for (berval** value = attr.a_vals; value != nullptr && *value != nullptr && written; ++value) {
        written = text.write_line(attr.a_type, type_length, masked_value);
    }
    return written;
}

// An attribute that something else than flatattr_insert has made.
bool write_foreign(text_buffer& text, const Attribute& attr)
{
    const std::size_t type_length = length_of_type(attr);
    bool written = true;
    for (berval** value = attr.a_vals; *value != nullptr && written; ++value) {
        const char* const bytes = (*value)->bv_val;
        written = text.write_line(attr.a_type, type_length, {bytes, bytes == nullptr ? 0 : (*value)->bv_len});
    }
    return written;
}

bool write_attributes(text_buffer& text, const Attribute* attr, const text_form& form)
{
    const bool plain = !form.leave_out_password_state && !form.trim_members && !form.mask_type_only;
    for (; attr != nullptr; attr = attr->a_next) {
        if (!plain && is_special(*attr, form)) {
            if (!write_special(text, *attr, form)) {
                return false;
            }
        } else if (attr->a_vals != nullptr) {
            const named_attribute* const named = named_attribute::of(*attr);
            if (!(named != nullptr ? text.write_lines(*named, attr->a_vals) : write_foreign(text, *attr))) {
                return false;
            }
        }
    }
    return true;
}

bool write_entry(text_buffer& text, const Entry& entry, const text_form& form, std::size_t* length)
{
    if (form.with_id && !text.write_id(entry.e_id, form.writer)) {
        return false;
    }
    if (entry.e_dn != nullptr && !text.write_dn(entry.e_dn)) {
        return false;
    }
    return write_attributes(text, entry.e_attrs, form) && text.terminate(length);
}

// Into the buffer of the caller, or the global one where he has none.
char* write_without_members(const Entry* entry, std::size_t* length, int print_id, char** buffer, std::size_t* size,
                            bool leave_out_password_state)
{
    if (entry == nullptr || (buffer != nullptr && size == nullptr)) {
        return nullptr;
    }
    const text_form form = {print_id != 0, false, true, leave_out_password_state,
                            "entry2str_wo_members_pwdattrs_internal"};
    char* cursor = nullptr;
    text_buffer text = buffer != nullptr ? text_buffer(buffer, &cursor, size)
                                         : text_buffer(&ebuf_global, &ecur_global, &emaxsize_global);
    if (!write_entry(text, *entry, form, length)) {
        return nullptr;
    }
    return buffer != nullptr ? *buffer : ebuf_global;
}

}  // namespace

extern "C" {

char* ebuf_global = nullptr;
char* ecur_global = nullptr;
std::size_t emaxsize_global = 0;

void initEnt2StrMutex(void)
{
    std::call_once(entry2str_mutex_made, [] { pthread_mutex_init(&entry2str_mutex, nullptr); });
}

void lockEnt2StrMutex(void)
{
    initEnt2StrMutex();
    pthread_mutex_lock(&entry2str_mutex);
}

void unlockEnt2StrMutex(void)
{
    pthread_mutex_unlock(&entry2str_mutex);
}

void MAKE_SPACE(std::size_t needed, int* error, char** buffer, char** cursor, std::size_t* size)
{
    *error = LDAP_SUCCESS;
    if (!make_space(needed, buffer, cursor, size)) {
        message_no_memory();
        debug_error("Error - MAKE_SPACE: realloc for newebuf failed. Out of memory\n");
        *error = LDAP_NO_MEMORY;
    }
}

char* entry2str_options(const Entry* entry, std::size_t* length, int options)
{
    if (entry == nullptr) {
        return nullptr;
    }
    const bool with_id = (options & ENTRY_TEXT_ID) != 0;
    text_buffer text(&ebuf_global, &ecur_global, &emaxsize_global);
    return write_entry(text, *entry, {with_id, with_id, false, false, "entry2str"}, length) ? ebuf_global : nullptr;
}

char* entry2str(const Entry* entry, std::size_t* length, int print_id)
{
    return entry2str_options(entry, length, print_id != 0 ? ENTRY_TEXT_ID : 0);
}

char* entry2str_wo_members(const Entry* entry, std::size_t* length, int print_id, char** buffer, std::size_t* size,
                           int /*ignored*/)
{
    return write_without_members(entry, length, print_id, buffer, size, false);
}

char* entry2str_wo_members_and_pwd_attribs(const Entry* entry, std::size_t* length, int print_id, char** buffer,
                                           std::size_t* size)
{
    return write_without_members(entry, length, print_id, buffer, size, true);
}

}  // extern "C"

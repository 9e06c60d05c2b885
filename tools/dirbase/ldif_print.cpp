// dirbase ldif print
#include <algorithm>
#include <cstdlib>
#include <new>

#include "libraries/libber/ldap_result.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/model/entry_ber.h"
#include "servers/vrnd/libdirbase/model/entry_text.h"
#include "tools/dirbase/ldif_commands.h"
#include "tools/dirbase/ldif_reader.h"
#include "tools/dirbase/text_file.h"

namespace dirbase_tool {

namespace {

constexpr std::size_t bytes_a_line = 32;

// Lines of hexadecimal digits, two a byte.
std::string hexadecimal(std::string_view bytes)
{
    constexpr char digits[] = "0123456789abcdef";
    std::string text;
    text.reserve(2 * bytes.size() + bytes.size() / bytes_a_line + 1);
    for (std::size_t i = 0; i < bytes.size(); ++i) {
        const auto byte = static_cast<unsigned char>(bytes[i]);
        text += digits[byte >> 4];
        text += digits[byte & 15];
        if ((i + 1) % bytes_a_line == 0 || i + 1 == bytes.size()) {
            text += '\n';
        }
    }
    return text;
}

// Writes entries in one form. Its buffer is used for one after the other.
class entry_writer {
public:
    explicit entry_writer(ldif_form form) : form_(form) { initEnt2StrMutex(); }
    ~entry_writer() { std::free(buffer_); }
    entry_writer(const entry_writer&) = delete;
    entry_writer& operator=(const entry_writer&) = delete;

    std::string write(const Entry& entry);

private:
    ldif_form form_;
    char* buffer_ = nullptr;
    std::size_t size_ = 0;
};

std::string entry_writer::write(const Entry& entry)
{
    std::size_t length = 0;
    std::string result;
    if (form_ == ldif_form::ber) {
        char* bytes = nullptr;
        const int failed = entry2ber(&entry, &bytes, &length);
        const heap_text owner(bytes);
        if (failed == LDAP_NO_MEMORY) {
            throw std::bad_alloc();
        }
        if (failed != LDAP_SUCCESS) {
            throw tool_failure(status_unusable, "", 0, std::string(entry.e_dn) + ": can't be encoded");
        }
        return hexadecimal({bytes, length});
    }
    if (form_ == ldif_form::without_members) {
        const char* const text = entry2str_wo_members(&entry, &length, 0, &buffer_, &size_, 0);
        result.assign(text == nullptr ? throw std::bad_alloc() : text, length);
        return result;
    }
    lockEnt2StrMutex();
    const char* const text = entry2str(&entry, &length, 0);
    try {
        result.assign(text == nullptr ? throw std::bad_alloc() : text, length);
    } catch (...) {
        unlockEnt2StrMutex();
        throw;
    }
    unlockEnt2StrMutex();
    return result;
}

}  // namespace

int print_ldif(const common_options& common, const std::string& file, ldif_form form)
{
    load_for_entries(common);
    const std::string source = source_name(file);
    ldif_reader reader(file, false);
    entry_writer writer(form);
    ldif_text text;
    ldif_fault_list faults;
    bool refused = false;
    std::size_t printed = 0;
    if (common.as_json) {
        write_result("{\n  \"entries\": [");
    }
    for (ldif_batch batch; reader.next(batch);) {
        const schema_reader guard;
        std::string out;
        std::string_view rest = batch.text;
        std::size_t line = batch.first_line;
        while (!rest.empty()) {
            const std::string_view entry = batch.too_large != 0 ? std::exchange(rest, {}) : take_entry(rest);
            faults.clear();
            entry_pointer made;
            if (batch.too_large != 0 || entry.size() > entry_limit) {
                faults.add(ldif_fault_kind::too_large, line, "", "an entry of more than 16 MiB");
            } else if (text.parse(entry, line, faults) == ldif_text::content::entry && faults.empty()) {
                made = make_entry(text, false, faults);
            }
            line += static_cast<std::size_t>(std::count(entry.begin(), entry.end(), '\n'));
            for (const ldif_fault& fault : faults.kept()) {
                tell(line_of(fault, source, text.dn() == nullptr ? "" : text.dn()->value) + "; the entry is left out");
                refused = true;
            }
            if (made == nullptr) {
                continue;
            }
            const std::string form_of_entry = writer.write(*made);
            if (common.as_json) {
                out +=
                    (printed == 0 ? "\n    " : ",\n    ") + json({{"dn", made->e_dn}, {"text", form_of_entry}})
                                                                .dump(-1, ' ', false, json::error_handler_t::replace);
            } else {
                out += (printed == 0 ? "" : "\n") + form_of_entry;
            }
            ++printed;
        }
        write_result(out);
    }
    if (common.as_json) {
        write_result(std::string(printed == 0 ? "" : "\n  ") + "],\n  \"ok\": " + (refused ? "false" : "true") +
                     "\n}\n");
    }
    return refused ? status_findings : status_yes;
}

}  // namespace dirbase_tool

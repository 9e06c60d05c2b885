// dirbase ldif print
#include <cstdlib>
#include <new>

#include "libraries/libber/ldap_result.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/model/entry_ber.h"
#include "servers/vrnd/libdirbase/model/entry_text.h"
#include "tools/dirbase/current_failure.h"
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

// Prints entries, one after the other.
class entry_printer {
public:
    entry_printer(ldif_form form, const std::string& source, bool as_json)
        : writer_(form), source_(source), as_json_(as_json)
    {
    }

    void print(const ldif_entry_text& entry);
    void write_out();
    void finish(const tool_failure* failure);
    int status() const { return refused_ ? status_findings : status_yes; }

private:
    entry_writer writer_;
    std::string source_;
    bool as_json_;
    ldif_text text_;
    ldif_fault_list faults_;
    std::string out_;  // what isn't written yet
    bool begun_ = false;
    bool refused_ = false;
};

void entry_printer::print(const ldif_entry_text& entry)
{
    faults_.clear();
    entry_pointer made;
    if (text_.parse(entry, faults_) == ldif_text::content::entry && faults_.empty()) {
        made = make_entry(text_, false, faults_);
    }
    for (const std::string& line : lines_of(faults_, text_, source_, "; the entry is left out")) {
        tell(line);
        refused_ = true;
    }
    if (made == nullptr) {
        return;
    }
    const std::string form = writer_.write(*made);
    if (as_json_) {
        out_ += (begun_ ? ",\n    " : "{\n  \"entries\": [\n    ") +
                json({{"dn", made->e_dn}, {"text", form}}).dump(-1, ' ', false, json::error_handler_t::replace);
    } else {
        out_ += (begun_ ? "\n" : "") + form;
    }
    begun_ = true;
    if (out_.size() >= results_limit) {
        write_out();
    }
}

void entry_printer::write_out()
{
    write_result(out_);
    out_.clear();
}

// Writes what comes last; with a failure that ended the work ahead of its time.
void entry_printer::finish(const tool_failure* failure)
{
    write_out();
    if (!as_json_) {
        return;
    }
    json rest = {{"ok", failure == nullptr && !refused_}};
    if (failure != nullptr) {
        rest["error"] = json_of(*failure);
    }
    write_result((begun_ ? "\n  ],\n" : "{\n  \"entries\": [],\n") +
                 rest.dump(2, ' ', false, json::error_handler_t::replace).substr(2) + "\n");
}

}  // namespace

int print_ldif(const common_options& common, const std::string& file, ldif_form form)
{
    load_for_entries(common);
    ldif_reader reader(file, false);
    entry_printer printer(form, source_name(file), common.as_json);
    return write_results(common.as_json, printer, [&] {
        for (ldif_batch batch; reader.next(batch);) {
            const schema_reader guard;
            for (ldif_entry_text entry; take_entry(batch, entry);) {
                printer.print(entry);
            }
            printer.write_out();
        }
    });
}

}  // namespace dirbase_tool

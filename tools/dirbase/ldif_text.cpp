// One entry of an LDIF file as text: see ldif_text.h.
#include "tools/dirbase/ldif_text.h"

#include <strings.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <cstring>

#include "libraries/libldif/control_text.h"
#include "libraries/libldif/line64.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "tools/dirbase/ldif_reader.h"

namespace dirbase_tool {

namespace {

constexpr std::size_t head_size = 4096;  // of an entry that is too large; where its DN is looked for

bool is_blank(char c)
{
    return c == ' ' || c == '\t';
}

bool same_word(const char* text, const char* word)
{
    return ::strcasecmp(text, word) == 0;
}

// Takes a line off a text, without its end.
std::string_view take_line(std::string_view& text)
{
    const std::size_t line_feed = text.find('\n');
    std::string_view line = text.substr(0, line_feed);
    text.remove_prefix(line_feed == std::string_view::npos ? text.size() : line_feed + 1);
    if (!line.empty() && line.back() == '\r') {
        line.remove_suffix(1);
    }
    return line;
}

// Stricter than the decoder, which stops at the first "=" and doesn't look at every character.
bool is_base64(std::string_view text)
{
    if (text.size() % 4 != 0) {
        return false;
    }
    for (int padding = 0; padding < 2 && !text.empty() && text.back() == '='; ++padding) {
        text.remove_suffix(1);
    }
    return std::all_of(text.begin(), text.end(), [](char c) {
        return (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z') || (c >= '0' && c <= '9') || c == '+' || c == '/';
    });
}

int digit_of(char c)
{
    if (c >= '0' && c <= '9') {
        return c - '0';
    }
    const char lower = static_cast<char>(c | 0x20);
    return lower >= 'a' && lower <= 'f' ? lower - 'a' + 10 : -1;
}

// The path that a URL names; empty when it names none.
std::string path_of(std::string_view url)
{
    constexpr std::string_view scheme = "file:///";
    std::string path;
    if (!url.starts_with(scheme)) {
        return path;
    }
    for (std::size_t at = scheme.size() - 1; at < url.size(); ++at) {
        char c = url[at];
        if (c == '%') {
            const int high = at + 2 < url.size() ? digit_of(url[at + 1]) : -1;
            const int low = high < 0 ? -1 : digit_of(url[at + 2]);
            if (low < 0 || high + low == 0) {
                return "";
            }
            c = static_cast<char>(high * 16 + low);
            at += 2;
        }
        path += c;
    }
    return path;
}

// The content of the file that a URL names, of at most `limit` bytes. Returns what is wrong, or an empty text.
std::string read_url(std::string_view url, std::size_t limit, std::string& content)
{
    const std::string path = path_of(url);
    if (path.empty()) {
        return quoted(url) + " is no URL of the form file:///PATH";
    }
    struct stat status = {};
    if (::stat(path.c_str(), &status) != 0) {
        return path + ": " + std::strerror(errno);
    }
    if (!S_ISREG(status.st_mode)) {
        return path + ": not a regular file";
    }
    if (static_cast<std::uint64_t>(status.st_size) > limit) {
        return path + ": larger than the 16 MiB that an entry may have";
    }
    berval bytes = {};
    if (localfromfile(path.c_str(), &bytes) < 0) {
        return path + ": can't be read";
    }
    const heap_text owner(bytes.bv_val);
    content.assign(bytes.bv_len == 0 ? "" : bytes.bv_val, bytes.bv_len);
    return "";
}

}  // namespace

ldif_text::content ldif_text::parse(const ldif_entry_text& entry, ldif_fault_list& faults)
{
    if (entry.size <= entry_limit) {
        return take_lines(entry.text, entry.line, faults);
    }
    const std::string_view head = entry.text.substr(0, head_size);
    take_lines(head.substr(0, head.rfind('\n') + 1), entry.line, faults);
    lines_.clear();
    faults.clear();
    faults.add(ldif_fault_kind::too_large, std::max(entry.line, line_), "",
               "an entry of " + std::to_string(entry.size) + " bytes, more than " + std::to_string(entry_limit));
    return content::too_large;
}

ldif_text::content ldif_text::take_lines(std::string_view text, std::size_t number, ldif_fault_list& faults)
{
    room_.resize(std::max(room_.size(), text.size() + 1));
    used_ = 0;
    files_.clear();
    file_bytes_ = 0;
    lines_.clear();
    has_dn_ = false;
    is_change_ = false;
    line_ = 0;
    while (!text.empty() && !is_change_) {
        const std::size_t begins = number;
        std::string_view joined;
        if (!join(text, number, joined, faults)) {
            continue;
        }
        if (!take_apart(joined, begins, faults) && line_ == 0) {
            line_ = begins;
        }
    }
    if (is_change_) {
        return content::change;
    }
    if (line_ == 0 && faults.empty()) {
        return content::nothing;
    }
    if (line_ == 0) {
        line_ = faults.kept().front().line;
    }
    if (!has_dn_) {
        faults.add(ldif_fault_kind::no_dn, line_, "", "no DN: the entry has no line \"dn: ...\"");
    }
    return content::entry;
}

// Takes a line with those that continue it off the text and puts them into the room, joined. False when there is
// nothing in it: an empty line, a comment, or one that continues nothing.
bool ldif_text::join(std::string_view& text, std::size_t& number, std::string_view& joined, ldif_fault_list& faults)
{
    const std::size_t begins = number;
    std::string_view line = take_line(text);
    ++number;
    const bool continues_nothing = !line.empty() && is_blank(line.front());
    char* const start = room_.data() + used_;
    char* end = std::copy(line.begin(), line.end(), start);
    while (!text.empty() && is_blank(text.front())) {
        line = take_line(text);
        ++number;
        end = std::copy(line.begin() + 1, line.end(), end);
    }
    joined = {start, static_cast<std::size_t>(end - start)};
    if (continues_nothing && joined.find_first_not_of(" \t") != std::string_view::npos) {
        faults.add(ldif_fault_kind::fold_at_start, begins, "",
                   "the line begins with a space, so it continues another, and there is none");
    }
    if (joined.empty() || joined.front() == '#' || continues_nothing) {
        return false;
    }
    *end = '\0';
    used_ += joined.size() + 1;
    return true;
}

// Takes a joined line, which lies in the room, apart. True when it is about the text and not the entry.
bool ldif_text::take_apart(std::string_view joined, std::size_t number, ldif_fault_list& faults)
{
    const std::size_t colon = joined.find(':');
    const std::size_t zero = joined.find('\0');
    if (colon == std::string_view::npos || zero < colon) {
        const bool is_binary = zero != std::string_view::npos;
        faults.add(is_binary ? ldif_fault_kind::nul_byte : ldif_fault_kind::no_colon, number, "",
                   is_binary ? "the line holds a byte 0" : "no \":\" in " + quoted(joined));
        return false;
    }
    // The parser of the library isn't for this: it takes a byte 1 for the mark of a fold, and drops it.
    char* const start = room_.data() + (joined.data() - room_.data());
    start[joined.substr(0, colon).find_last_not_of(' ') + 1] = '\0';
    std::string_view value = joined.substr(colon + 1);
    const bool base64 = value.starts_with(':');
    const bool is_url = value.starts_with('<');
    if (base64 || is_url) {
        value.remove_prefix(std::min(value.find_first_not_of(' ', 1), value.size()));
    } else if (value.starts_with(' ')) {
        value.remove_prefix(1);  // others belong to the value
    }
    ldif_line line = {};
    line.line = number;
    line.type = start;
    line.value = start + joined.size() - value.size();
    line.length = value.size();
    const bool is_text = zero == std::string_view::npos;
    if (!is_text || (base64 && !is_base64(value))) {
        line.spoilt = true;
        faults.add(is_text ? ldif_fault_kind::bad_base64 : ldif_fault_kind::nul_byte, number, line.type,
                   is_text ? quoted(value) + " is no Base64" : "the line holds a byte 0");
        line.value = start + joined.size();
        line.length = 0;
    } else if (base64) {
        base64decode(line.value, line.value, &line.length);
    } else if (is_url) {
        read_file(line, faults);
    }
    if (is_about_text(line, faults)) {
        return true;
    }
    if (!same_word(line.type, "dn")) {
        lines_.push_back(line);
    } else if (has_dn_) {
        faults.add(ldif_fault_kind::second_dn, number, "",
                   "a second DN, behind that of line " + std::to_string(dn_.line) +
                       "; is an empty line missing in front of it?");
    } else {
        dn_ = line;
        has_dn_ = true;
    }
    return false;
}

// Puts the content of a file in the place of its URL.
void ldif_text::read_file(ldif_line& line, ldif_fault_list& faults)
{
    std::string& file = files_.emplace_back();
    const std::string wrong = read_url({line.value, line.length}, entry_limit - file_bytes_, file);
    file_bytes_ = std::min(file_bytes_ + file.size(), entry_limit);  // one may have grown while it was read
    if (!wrong.empty()) {
        line.spoilt = true;
        faults.add(ldif_fault_kind::bad_url, line.line, line.type, wrong);
    }
    line.value = file.data();
    line.length = file.size();
}

// The version in front of the DN; behind it, what is to be done, with controls for that.
bool ldif_text::is_about_text(const ldif_line& line, ldif_fault_list& faults)
{
    if (!has_dn_ && lines_.empty() && same_word(line.type, "version")) {
        if (std::strcmp(line.value, "1") != 0) {
            faults.add(ldif_fault_kind::bad_version, line.line, "version",
                       quoted({line.value, line.length}) + " is none that is known; it has to be 1");
        }
        return true;
    }
    const auto is_control = [](const ldif_line& earlier) { return same_word(earlier.type, "control"); };
    if (!has_dn_ || !same_word(line.type, "changetype") || !std::all_of(lines_.begin(), lines_.end(), is_control)) {
        return false;
    }
    lines_.clear();
    if (!same_word(line.value, "add")) {
        is_change_ = true;
        line_ = dn_.line;
        faults.add(ldif_fault_kind::changetype, line.line, "changetype",
                   quoted({line.value, line.length}) + " is no addition of an entry, so there is nothing to check");
    }
    return true;
}

std::vector<std::string> lines_of(const ldif_fault_list& faults, const ldif_text& entry, const std::string& source,
                                  const std::string& result)
{
    std::vector<std::string> lines;
    for (const ldif_fault& fault : faults.kept()) {
        lines.push_back(line_of(fault, source, dn_of(entry)) + result);
    }
    if (faults.left_out() != 0) {
        lines.push_back(source + ":" + std::to_string(entry.line()) + ": " + words_for_left_out(faults));
    }
    return lines;
}

std::string dn_of(const ldif_text& entry)
{
    return entry.dn() == nullptr ? "" : std::string(entry.dn()->value, entry.dn()->length);
}

void append_ldif_line(std::string& text, const char* type, std::string_view value)
{
    const std::size_t old_size = text.size();
    text.resize(old_size + ldif_line_room(std::strlen(type), value.size()));
    char* end = text.data() + old_size;
    put_type_and_value(&end, type, value.data(), value.size());
    text.resize(static_cast<std::size_t>(end - text.data()));
}

}  // namespace dirbase_tool

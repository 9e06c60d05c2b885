// Reading a configuration file (README.md tells the format): see cfg_tree.h. Nothing in the file is trusted.
#include <algorithm>
#include <array>
#include <cerrno>
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <utility>

#include <fcntl.h>
#include <strings.h>
#include <sys/stat.h>
#include <unistd.h>

#include "libraries/libcfg/cfg_tree.h"

namespace {

class descriptor {
public:
    explicit descriptor(int number) : number_(number) {}
    ~descriptor()
    {
        if (number_ >= 0) {
            close(number_);
        }
    }
    descriptor(const descriptor&) = delete;
    descriptor& operator=(const descriptor&) = delete;
    int number() const { return number_; }

private:
    int number_;
};

cfg_failure read_all(const char* path, wiped_text& text)
{
    // Without waiting, or a pipe in the place of the file would hold the server up.
    const descriptor file(open(path, O_RDONLY | O_CLOEXEC | O_NONBLOCK));
    if (file.number() < 0) {
        return {LDAP_LOCAL_ERROR, "the file can't be opened", 0, errno};
    }
    struct stat status = {};
    if (fstat(file.number(), &status) != 0) {
        return {LDAP_LOCAL_ERROR, "the file can't be read", 0, errno};
    }
    if (!S_ISREG(status.st_mode)) {
        return {LDAP_LOCAL_ERROR, "it is no regular file"};
    }
    // A file of the shortest entries takes some twenty times its length in memory.
    constexpr std::size_t longest = std::size_t{16} * 1024 * 1024;
    constexpr std::size_t step = 65536;
    text.reserve(std::min(static_cast<std::size_t>(status.st_size), longest) + step);
    for (;;) {
        const std::size_t length = text.size();
        if (length > longest) {
            return {LDAP_LOCAL_ERROR, "the file is too long"};
        }
        text.resize(length + step);
        const ssize_t got = read(file.number(), text.data() + length, step);
        text.resize(length + static_cast<std::size_t>(got > 0 ? got : 0));
        if (got == 0) {
            return {};
        }
        if (got < 0 && errno != EINTR) {
            return {LDAP_LOCAL_ERROR, "the file can't be read", 0, errno};
        }
    }
}

// Gives the lines of a text with their continuations.
class line_reader {
public:
    explicit line_reader(std::string_view text) : rest_(text) {}

    bool next(std::string& line)
    {
        if (rest_.empty()) {
            return false;
        }
        number_ = physical_ + 1;
        line = take();
        while (!line.empty() && rest_.starts_with(' ')) {
            line += take().substr(1);
        }
        return true;
    }

    // Of the line given last, where it begins.
    std::size_t number() const { return number_; }

private:
    std::string_view take()
    {
        ++physical_;
        const std::size_t end = rest_.find('\n');
        std::string_view line = rest_.substr(0, end);
        rest_.remove_prefix(end == std::string_view::npos ? rest_.size() : end + 1);
        if (line.ends_with('\r')) {
            line.remove_suffix(1);
        }
        return line;
    }

    std::string_view rest_;
    std::size_t physical_ = 0;
    std::size_t number_ = 0;
};

// The value of each base64 character, and 64 for any other.
constexpr std::array<std::uint8_t, 256> make_base64_digits()
{
    constexpr std::string_view alphabet = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
    std::array<std::uint8_t, 256> digits = {};
    digits.fill(64);
    for (std::size_t i = 0; i < alphabet.size(); ++i) {
        digits[static_cast<unsigned char>(alphabet[i])] = static_cast<std::uint8_t>(i);
    }
    return digits;
}
constexpr std::array<std::uint8_t, 256> base64_digits = make_base64_digits();

// Padded, and with no bit set behind the last byte (RFC 4648 sections 3.2 and 3.5). False for another text.
bool decode_base64(std::string_view text, std::string& bytes)
{
    if (text.size() % 4 != 0) {
        return false;
    }
    const std::size_t padding = text.ends_with("==") ? 2 : text.ends_with('=') ? 1 : 0;
    text.remove_suffix(padding);
    bytes.reserve(text.size() / 4 * 3 + 2);
    unsigned bits = 0;
    int count = 0;
    for (const char c : text) {
        const unsigned digit = base64_digits[static_cast<unsigned char>(c)];
        if (digit == 64) {
            return false;
        }
        bits = (bits << 6 | digit) & 0xFFFF;
        count += 6;
        if (count >= 8) {
            count -= 8;
            bytes += static_cast<char>(bits >> count & 0xFF);
        }
    }
    return (bits & ((1u << count) - 1)) == 0;
}

bool is_name(std::string_view name)
{
    return !name.empty() && name.find_first_not_of("ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz"
                                                   "0123456789-.;_") == std::string_view::npos;
}

// Splits a line at its colon. Returns null, or what is wrong with the line.
const char* split(std::string_view line, std::string_view& name, std::string& value)
{
    const std::size_t colon = line.find(':');
    if (colon == std::string_view::npos) {
        return "a line without a colon";
    }
    name = line.substr(0, colon);
    if (!is_name(name)) {
        return "a malformed attribute name";
    }
    line.remove_prefix(colon + 1);
    const bool encoded = line.starts_with(':');
    if (line.starts_with('<')) {
        return "a value in another file";
    }
    line.remove_prefix(encoded ? 1 : 0);
    const std::size_t start = line.find_first_not_of(' ');
    line.remove_prefix(start == std::string_view::npos ? line.size() : start);
    value.clear();
    if (!encoded) {
        value = line;
    } else if (!decode_base64(line, value)) {
        return "malformed base64";
    }
    return value.find('\0') == std::string::npos ? nullptr : "a value with a zero byte";
}

// Builds the tree line by line.
class tree_builder {
public:
    explicit tree_builder(cfg_tree& tree) : tree_(tree) {}

    cfg_failure take(std::string_view line, std::size_t number)
    {
        if (line.starts_with('#')) {
            return {};
        }
        if (line.empty()) {
            entry_ = nullptr;
            return {};
        }
        if (line.starts_with(' ')) {
            return {LDAP_DECODING_ERROR, "a continuation of no line", number};
        }
        std::string_view name;
        wiped_text value;
        if (const char* const fault = split(line, name, value); fault != nullptr) {
            return {LDAP_DECODING_ERROR, fault, number};
        }
        const bool is_dn = name.size() == 2 && strncasecmp(name.data(), "dn", 2) == 0;
        if (is_dn != (entry_ == nullptr)) {
            return {LDAP_DECODING_ERROR, is_dn ? "a second dn in one entry" : "an entry without dn", number};
        }
        if (is_dn) {
            return begin_entry(std::move(value), number);
        }
        entry_->add(name, {std::move(value), number});
        return {};
    }

private:
    cfg_failure begin_entry(std::string dn, std::size_t number)
    {
        std::string key;
        if (!make_cfg_key(dn, key) || key.empty()) {
            return {LDAP_INVALID_DN_SYNTAX, "a malformed dn", number};
        }
        const auto [place, fresh] = tree_.try_emplace(std::move(key));
        if (!fresh) {
            return {LDAP_ALREADY_EXISTS, "a second entry of that dn", number};
        }
        entry_ = &place->second;
        entry_->dn = std::move(dn);
        return {};
    }

    cfg_tree& tree_;
    cfg_entry* entry_ = nullptr;  // null between entries
};

}  // namespace

cfg_failure read_cfg_file(const char* path, cfg_tree& tree)
{
    wiped_text text;
    cfg_failure failure = read_all(path, text);
    line_reader lines(text);
    tree_builder builder(tree);
    wiped_text line;
    line.reserve(text.size());  // continuations don't make it move
    while (failure.code == LDAP_SUCCESS && lines.next(line)) {
        failure = builder.take(line, lines.number());
    }
    return failure;
}

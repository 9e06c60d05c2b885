// Shared pieces of the schema definitions: see ldcf_common.h.
#include "servers/vrnd/libdirbase/schema/ldcf_common.h"

#include <charconv>

namespace {

// Guards the moment in which a built text is kept. Held for one assignment, and readers only meet here while a text is
// asked for the first time, so one lock serves all definitions.
std::mutex text_cache_mutex;

}  // namespace

std::recursive_mutex& ldcf_record_mutex()
{
    static std::recursive_mutex mutex;
    return mutex;
}

bool ldcf_names_equal(const ldcf_names& a, const ldcf_names& b)
{
    if (a.size() != b.size()) {
        return false;
    }
    for (auto left = a.begin(), right = b.begin(); left != a.end(); ++left, ++right) {
        if (csgl_str_ci_compare(*left, *right) != 0) {
            return false;
        }
    }
    return true;
}

// The source may be in the hands of readers at this moment; the target belongs to the caller.
ldcf_text_cache& ldcf_text_cache::operator=(const ldcf_text_cache& other)
{
    const bool filled = other.filled_.load(std::memory_order_acquire);
    text_ = filled ? other.text_ : csgl_string();
    filled_.store(filled, std::memory_order_release);
    return *this;
}

void ldcf_text_cache::clear()
{
    filled_.store(false, std::memory_order_relaxed);
    text_ = csgl_string();
}

void ldcf_text_cache::keep(const csgl_string& text) const
{
    const std::lock_guard<std::mutex> guard(text_cache_mutex);
    if (!filled_.load(std::memory_order_relaxed)) {
        text_ = text;
        filled_.store(true, std::memory_order_release);
    }
}

csgl_string ldcf_quoted_parameter(const csgl_string& value)
{
    return ldcf_join("[p['", value, "']p]");
}

csgl_string ldcf_number(long value)
{
    char text[24];
    const auto end = std::to_chars(text, text + sizeof(text), value).ptr;
    return {text, static_cast<unsigned>(end - text)};
}

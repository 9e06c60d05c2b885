// See fuzz_support.h.
#include "fuzz/support/fuzz_support.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "libraries/libmsg/message_log.h"
#include "servers/vrnd/libdirbase/base/backend.h"

namespace fuzz_support {

namespace {

Backend relational_store{.be_type = "rdbm"};

[[maybe_unused]] const bool prepared = [] {
    set_message_sink([](void*, const message_record&) {}, nullptr);
    g_backends = &relational_store;
    return true;
}();

}  // namespace

void expect(bool holds, const char* claim)
{
    if (!holds) {
        std::fprintf(stderr, "violated: %s\n", claim);
        std::abort();
    }
}

exact_text::exact_text(const std::uint8_t* data, std::size_t size)
{
    const std::size_t length = size == 0 ? 0 : strnlen(reinterpret_cast<const char*>(data), size);
    text_.reset(new char[length + 1]);
    if (length != 0) {
        std::memcpy(text_.get(), data, length);
    }
    text_[length] = '\0';
}

}  // namespace fuzz_support

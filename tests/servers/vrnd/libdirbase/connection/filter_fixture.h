// Reading filters from BER in tests, each from a block of its exact size.
#pragma once

#include <cstring>
#include <memory>
#include <string>

#include "servers/vrnd/libdirbase/connection/filter_ber.h"
#include "servers/vrnd/libdirbase/model/filter_guards.h"
#include "servers/vrnd/str2filter.h"
#include "tests/servers/vrnd/libdirbase/model/model_fixture.h"
#include "tests/support/filter_encoding.h"

namespace model_test {

using heap_chars = std::unique_ptr<char, decltype(&std::free)>;

inline heap_chars owned(char* text)
{
    return {text, std::free};
}

class ber_input {
public:
    explicit ber_input(const std::string& bytes) : bytes_(new char[bytes.size()])
    {
        std::memcpy(bytes_.get(), bytes.data(), bytes.size());
        const berval value = {bytes.size(), bytes_.get()};
        ber_init2(&value, 0, &ber_);
    }
    BerElement* get() { return &ber_; }
    std::size_t left() const { return static_cast<std::size_t>(ber_.ber_end - ber_.ber_ptr); }

private:
    std::unique_ptr<char[]> bytes_;
    BerElement ber_ = {};
};

struct filter_answer {
    int result = 0;
    filter_guard filter;
    heap_chars text = owned(nullptr);
    heap_chars error_text = owned(nullptr);
    std::size_t left = 0;  // bytes behind the position
};

inline filter_answer read_filter(const std::string& bytes, const Connection* conn = nullptr)
{
    ber_input input(bytes);
    filter_answer answer;
    Filter* filter = nullptr;
    char* text = nullptr;
    char* error_text = nullptr;
    answer.result = get_filter(conn, input.get(), &filter, &text, &error_text);
    answer.filter.reset(filter);
    answer.text = owned(text);
    answer.error_text = owned(error_text);
    answer.left = input.left();
    return answer;
}

inline filter_answer read_filter_text(const char* text, const Connection* conn = nullptr)
{
    const filter_guard raw(str2filter(text, 0));
    return read_filter(test_support::ber_of(*raw), conn);
}

// The text of a filter, "undefined", or its result.
inline std::string told(const filter_answer& answer)
{
    if (answer.result != 0) {
        return std::to_string(answer.result);
    }
    return answer.text == nullptr ? "undefined" : answer.text.get();
}

}  // namespace model_test

// Both time parsers on any text, against the slow implementation of the tests. Local time is five and a half hours
// ahead.
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <ctime>

#include "fuzz/support/fuzz_support.h"
#include "servers/vrnd/libdirbase/model/timestamp.h"
#include "tests/servers/vrnd/libdirbase/model/slow_time.h"

namespace {

constexpr std::chrono::minutes ahead(330);
constexpr tag_timestamp_struct untouched = {-7, -7, -7, -7, -7, -7, -7};

[[maybe_unused]] const bool prepared = [] {
    setenv("TZ", "HERE-5:30", 1);
    tzset();
    return true;
}();

int present_year()
{
    const auto local_day = std::chrono::floor<std::chrono::days>(std::chrono::system_clock::now() + ahead);
    return int(std::chrono::year_month_day(local_day).year());
}

void check(int (*parse)(const char*, tag_timestamp_struct*), const char* text, bool generalized)
{
    const int year = present_year();
    tag_timestamp_struct stored = untouched;
    const int result = parse(text, &stored);
    if (present_year() != year) {
        return;  // it may have been read in either
    }
    const test_support::slow_time expected = test_support::slow_read_time(text, generalized, year, ahead);
    fuzz_support::expect(result == expected.result, "both implementations agree on the result");
    fuzz_support::expect(stored == expected.stored.value_or(untouched), "both implementations store the same time");
    fuzz_support::expect(parse(text, nullptr) == result, "a check has the result of the reading");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    const fuzz_support::exact_text text(data, size);
    check(str2GeneralizedTime, text.c_str(), true);
    check(str2UTCTime, text.c_str(), false);
    return 0;
}

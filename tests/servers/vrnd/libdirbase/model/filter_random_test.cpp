// Any filter on any entry: the library and the slow evaluator agree.
#include <random>
#include <string_view>

#include "tests/servers/vrnd/libdirbase/model/filter_fixture.h"
#include "tests/support/slow_filter.h"

using model_test::test_entry;

namespace {

class FilterRandom : public model_test::Filters {};

class random_tests {
public:
    explicit random_tests(unsigned seed) : random_(seed) {}

    std::string filter(unsigned depth = 0)
    {
        const unsigned kind = number(depth < 4 ? 8 : 4);
        if (kind < 4) {
            return item();
        }
        std::string text = kind == 4 ? "(!" : kind < 7 ? "(&" : "(|";
        const unsigned children = kind == 4 ? 1 : number(4);
        for (unsigned i = 0; i < children; ++i) {
            text += filter(depth + 1);
        }
        return text + ")";
    }

    void fill(test_entry& entry)
    {
        for (unsigned i = number(8); i > 0; --i) {
            const char* const type = name();
            std::vector<std::string> values;
            for (unsigned j = number(4); j > 0; --j) {
                values.push_back(value(type));
            }
            const auto [drop, mode] = pick({std::pair(0, 0), std::pair(1, 1), std::pair(0, 1), std::pair(0, 2)});
            entry.merge(type, values, drop, mode);  // what is refused isn't there
        }
        Attribute* const two_way = entry.find("twoWay");
        if (two_way != nullptr && number(2) == 0) {
            attr_free_normvals(two_way);  // a tree may be of values in the clear
            attr_encode_attribute(two_way);
            attr_create_decodedvals(two_way);
        }
    }

    unsigned number(unsigned below) { return std::uniform_int_distribution<unsigned>(0, below - 1)(random_); }

private:
    template <typename T>
    T pick(std::initializer_list<T> choices)
    {
        return choices.begin()[number(static_cast<unsigned>(choices.size()))];
    }

    const char* name()
    {
        return pick({"cn",
                     "cn",
                     "commonName;lang-en",
                     "cn;lang-de",
                     "sn",
                     "member",
                     "member;lang-en",
                     "number",
                     "flag",
                     "time",
                     "cert",
                     "tel",
                     "ref",
                     "ref;lang-en",
                     "oneWay",
                     "twoWay",
                     "objectClass",
                     "utc",
                     "bits",
                     "digits",
                     "none"});
    }

    // Half of the time one of the attribute's syntax.
    std::string value(std::string_view type)
    {
        if (number(2) == 0) {
            if (type == "number") {
                return pick({"1", "-1", "01", "7"});
            }
            if (type == "time" || type == "utc") {
                return type == "utc" ? "240101000000Z" : pick({"20240101000000Z", "20240101010000+0100"});
            }
            if (type == "bits") {
                return pick({"'0101'B", "'1'b", "'0'B "});
            }
            if (type.starts_with("member")) {
                return pick({"cn=a", "CN=A", "cn=a,sn=b", "cn=\"c,;+\""});
            }
        }
        return pick({"a",
                     "A",
                     "b",
                     "ab",
                     "aba",
                     "a b",
                     "a-b",
                     "abab",
                     "cn=a",
                     "CN=A",
                     "cn=a,sn=b",
                     "cn=\"c,;+\"",
                     "1",
                     "-1",
                     "01",
                     "TRUE",
                     "FALSE",
                     "20240101000000Z",
                     "20240101010000+0100",
                     "240101000000Z",
                     "",
                     "\xc3\xbc",
                     "\xff"
                     "a",
                     "a\nb",
                     "employee",
                     "worker"});
    }

    std::string item()
    {
        const char* const type = name();
        const std::string start = std::string("(") + type;
        switch (number(6)) {
        case 0: return start + "=*)";
        case 1: return start + ">=" + value(type) + ")";
        case 2: return start + "<=" + value(type) + ")";
        case 3: return start + "~=" + value(type) + ")";
        case 4: {
            std::string text = start + "=" + pick({"", "a", "cn=", "A"}) + "*";
            for (unsigned i = number(3); i > 0; --i) {
                text += std::string(pick({"a", "b", "ba", ",", ""})) + "*";
            }
            return text + pick({"", "b", "a", "ab"}) + ")";
        }
        default: return start + "=" + value(type) + ")";
        }
    }

    std::mt19937 random_;
};

TEST_F(FilterRandom, AgreesWithTheSlowEvaluatorOnRandomFilters)
{
    std::vector<std::size_t> results(100);
    for (unsigned seed = 1; seed <= 1500; ++seed) {
        random_tests random(seed);
        test_entry entry;
        random.fill(entry);
        for (int i = 0; i < 30; ++i) {
            const std::string text = random.filter();
            const filter_guard filter(str2filter(text.c_str(), static_cast<int>(random.number(2))));
            if (filter == nullptr) {
                continue;
            }
            const int result = test_filter(&entry, filter.get());
            ASSERT_EQ(result, test_support::slow_test_filter(entry, filter.get()))
                << "seed " << seed << " " << text << "\n"
                << model_test::described(entry);
            ++results.at(static_cast<std::size_t>(result + 1));
        }
    }
    for (const int result : {-1, 0, 1, 87, 92}) {
        EXPECT_GT(results[static_cast<std::size_t>(result + 1)], 20u) << result;
    }
}

}  // namespace

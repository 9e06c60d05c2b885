// Comparing two states of an entry: from short lists to long ones the time may grow only as that of sorting the names.
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include <benchmark/benchmark.h>

#include "servers/vrnd/libdirbase/model/entry_mods.h"

namespace {

// Attributes without values in the order of a generator that visits every number below `count` (a power of two) once.
class attribute_list {
public:
    attribute_list(std::size_t count, std::size_t offset) : names_(count), records_(count)
    {
        for (std::size_t i = 0; i < count; ++i) {
            names_[i] = "attribute-" + std::to_string((i * 40503 + 7) % count + offset);
            records_[i].a_type = names_[i].data();
            records_[i].a_next = i + 1 < count ? &records_[i + 1] : nullptr;
        }
    }
    const Attribute* first() const { return records_.data(); }

private:
    std::vector<std::string> names_;
    std::vector<Attribute> records_;
};

void compare_states(benchmark::State& state)
{
    const auto count = static_cast<std::size_t>(state.range(0));
    const attribute_list old_state(count, 0);
    const attribute_list new_state(count, count / 2);  // half of each is in the other
    for (auto _ : state) {
        LDAPMod** mods = nullptr;
        if (diffEntriesToMods(new_state.first(), old_state.first(), &mods) != 0) {
            state.SkipWithError("no memory");
        }
        free_ldmarr(mods);
    }
    state.SetItemsProcessed(state.iterations() * static_cast<std::int64_t>(2 * count));
}
BENCHMARK(compare_states)->Name("diffEntriesToMods")->Arg(16)->Arg(1024)->Arg(131072);

}  // namespace

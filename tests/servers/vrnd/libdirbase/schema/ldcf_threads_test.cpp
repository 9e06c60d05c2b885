// Readers side by side: text forms that all of them ask for first, and handles that come and go.
#include <atomic>
#include <thread>

#include "servers/vrnd/libdirbase/schema/ldcf_api.h"
#include "tests/servers/vrnd/libdirbase/schema/schema_fixture.h"

using schema_test::described;

namespace {

constexpr std::size_t thread_count = 8;

// Runs an action in several threads that all start together.
template <typename Action>
void side_by_side(const Action& action)
{
    std::atomic<std::size_t> waiting{thread_count};
    std::vector<std::thread> threads;
    for (std::size_t i = 0; i < thread_count; ++i) {
        threads.emplace_back([&, i] {
            --waiting;
            while (waiting != 0) {
                std::this_thread::yield();
            }
            action(i);
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
}

std::atomic<int> records_made{0};

void load(ldcf_schema& schema)
{
    const schema_test::relational_store store;
    schema_test::load_shipped(schema);
    schema.complete();
    schema.complete_db_names();
}

}  // namespace

TEST(LdcfThreads, TextFormsAskedForByManyReadersAtOnceAreThoseThatOneGets)
{
    ldcf_schema schema, alone, copy;
    load(schema);
    load(alone);
    const ldcf_schema& published = schema;
    std::vector<std::string> seen(thread_count);
    std::vector<std::vector<const char*>> places(thread_count);
    side_by_side([&](std::size_t i) {
        if (i == 0) {
            seen[0] = described(copy.copy(published));  // reads too
            return;
        }
        for (const auto& [key, type] : published.attribute_types) {
            type->v3_inherited();
            places[i].push_back(type.v3_string());
        }
        for (const auto& [key, objclass] : published.object_classes) {
            objclass->v3_inherited();
            places[i].push_back(objclass.v3_string_inherited());
        }
        seen[i] = described(published);
    });
    for (std::size_t i = 0; i < thread_count; ++i) {
        EXPECT_TRUE(seen[i] == described(alone));
        EXPECT_TRUE(i == 0 || places[i] == places[1]);  // a text that was given out stays
    }
}

TEST(LdcfThreads, HandlesTakenByManyThreadsAreAllGivenBack)
{
    ldcf_schema schema;
    load(schema);
    const ldcf_schema& published = schema;
    const auto counts = [&] {
        std::vector<int> result;
        for (const auto& entry : published.attribute_types) {
            result.push_back(entry.second->value());
        }
        for (const auto& entry : published.object_classes) {
            result.push_back(entry.second->value());
        }
        return result;
    };
    const std::vector<int> before = counts();
    std::atomic<std::size_t> wrong{0};
    side_by_side([&](std::size_t) {
        for (std::size_t round = 0; round < 20; ++round) {
            csgl_vector<ldcf_attrtype> held;
            for (const auto& [key, type] : published.attribute_types) {
                held.push_back(ldcf_find(published.attribute_types, type.name()));
                wrong += held.back() == type ? 0u : 1u;
            }
            for (const auto& [key, objclass] : published.object_classes) {
                const csgl_set<ldcf_objclass> relatives = objclass->superclasses();
                wrong += relatives.size() == objclass->superclasses().size() ? 0u : 1u;
            }
        }
    });
    EXPECT_EQ(wrong, 0u);
    EXPECT_EQ(counts(), before);
}

TEST(LdcfThreads, ARecordThatManyReadersAskForFirstIsMadeOnce)
{
    load(*ldcf_schema_g);
    Backend counting{.be_type = "rdbm", .be_fill_attr_info = [](asyntaxinfo*) { ++records_made; }};
    g_backends = &counting;
    std::size_t types = 0;
    ldcf_for_each_definition(ldcf_schema_g->attribute_types, [&](const ldcf_attrtype&) { ++types; });
    std::vector<std::vector<const void*>> seen(thread_count);
    const auto look_all_up = [&](std::size_t i) {
        seen[i].clear();
        for (const auto& [key, type] : ldcf_schema_g->attribute_types) {
            seen[i].push_back(ldcf_api_attr_get_info(key, nullptr));
        }
        for (const auto& [key, objclass] : ldcf_schema_g->object_classes) {
            seen[i].push_back(ldcf_api_objectclass_get_info(key));
        }
        EXPECT_EQ(seen[i].size(), ldcf_schema_g->attribute_types.size() + ldcf_schema_g->object_classes.size());
    };
    side_by_side(look_all_up);
    const std::vector<const void*> made = seen[0];
    EXPECT_EQ(static_cast<std::size_t>(records_made), types);
    ldcf_api_load_attr_hash();
    side_by_side(look_all_up);  // through the cache now
    for (const auto& records : seen) {
        EXPECT_TRUE(records == made);
    }
    g_backends = nullptr;
    ldcf_schema_g->clear();
}

// What plug-in code with a plain C interface gets by name.

#include <cstring>

#include "core/engine/qvcodec.h"
#include "tests/support/checks.h"

namespace {

template <class F>
F* service(const char* name) {
    return reinterpret_cast<F*>(QvCodec::get_rc(name));
}
template <class F>
F* serviceEx(const char* name) {
    return reinterpret_cast<F*>(QvCodec::get_rc_ex(nullptr, name));
}

TEST(Services, OnlyKnownNames) {
    for (const char* name : {"nonsense", "", "err_printf_ex", static_cast<const char*>(nullptr)})
        EXPECT_EQ(QvCodec::get_rc(name), nullptr);
    for (const char* name : {"malloc", "free", "yield", "nonsense", static_cast<const char*>(nullptr)})
        EXPECT_EQ(QvCodec::get_rc_ex(nullptr, name), nullptr);
}

TEST(Services, MemoryAndConstants) {
    auto* allocate = service<void*(unsigned)>("malloc");
    auto* release = service<void(void*)>("free");
    ASSERT_TRUE(allocate && release);
    for (const unsigned size : {0u, 100000u}) {
        void* const block = allocate(size);
        ASSERT_NE(block, nullptr);
        release(std::memset(block, 1, size));
    }
    release(nullptr);
    EXPECT_EQ(service<int()>("yield")(), 0);
    EXPECT_EQ(service<int()>("prompt_index_mode")(), 1);
    EXPECT_EQ(serviceEx<int(void*)>("prompt_index_mode")(nullptr), 1);
}

TEST(Services, MessagesReachTheUsersList) {
    using Printer = void(void*, const char*, ...);
    for (const auto& [name, mask] : {std::pair<std::string, int>{"err_printf", 2},
                                     {"wrn_printf", 4},
                                     {"inf_printf", 8},
                                     {"prg_printf", 0}}) {
        qv_log()->clear();
        service<void(const char*, ...)>(name.c_str())("%s %d", "plain", 1);
        serviceEx<Printer>(name.c_str())(qv_log(), "%s %d", "context", 2);
        serviceEx<Printer>((name + "_ex").c_str())(nullptr, "%s %d", "ex", 3);
        AnyVector all;
        qv_log()->getAll(all);
        ASSERT_EQ(all.size(), mask ? 3 : 0) << name;
        const char* texts[] = {"plain 1", "context 2", "ex 3"};
        for (int i = 0; i < all.size(); ++i) {
            EXPECT_STREQ(all.at(i).asDict().getString("text"), texts[i]);
            EXPECT_EQ(all.at(i).asDict().getInt32("type"), mask);
        }
    }
    service<void(const char*, ...)>("inf_printf")("%s", std::string(1500, 'x').c_str());
    AnyVector all;
    qv_log()->getAll(all);
    EXPECT_EQ(std::strlen(all.back().asDict().getString("text")), 1023u);
    qv_log()->clear();
}

}  // namespace

// What plug-in code with a plain C interface gets by name.

#include "core/engine/modules/qvcodec.h"
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
    qv_log()->clear();
}

}  // namespace

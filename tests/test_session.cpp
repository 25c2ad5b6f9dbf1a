// System instance naming: every system-wide name derives from KT48_SESSION.

#include "harness.h"

#include "kt48host.h"

#include <climits>
#include <cstdlib>
#include <string>

namespace {

std::string Name(const char *target, size_t size = 512) {
    char out[512];
    return KT48Host_SystemName(target, out, size) == 0 ? std::string(out) : std::string("<fail>");
}

class Session : public ::testing::Test {
protected:
    void TearDown() override { unsetenv(KT48HOST_SESSION_VARIABLE); }
};

TEST_F(Session, UnsetKeepsTheTargetsNames) {
    unsetenv(KT48HOST_SESSION_VARIABLE);
    EXPECT_EQ("/tmp/SHM/", Name("/tmp/SHM/"));
    EXPECT_EQ("/KT48API_INIT", Name("/KT48API_INIT"));
    EXPECT_EQ("TED", Name("TED"));
    setenv(KT48HOST_SESSION_VARIABLE, "", 1);  // empty is unset
    EXPECT_EQ("/KT48API_INIT", Name("/KT48API_INIT"));
}

TEST_F(Session, AWordDerivesEveryKindOfName) {
    setenv(KT48HOST_SESSION_VARIABLE, "unit-7", 1);
    EXPECT_EQ("/tmp/SHM.unit-7/", Name("/tmp/SHM/"));
    EXPECT_EQ("/tmp/SHM.unit-7/System_Mutex", Name("/tmp/SHM/System_Mutex"));
    EXPECT_EQ("/unit-7.KT48API_INIT", Name("/KT48API_INIT"));
    EXPECT_EQ("unit-7.TED", Name("TED"));
}

TEST_F(Session, LongPosixNamesStayWithinNameMaxAndDistinct) {
    setenv(KT48HOST_SESSION_VARIABLE, "abcdefghijklmnopqrstuvwx", 1);  // the longest word
    std::string a = "/" + std::string(251, 'a') + "_mtx";
    std::string b = "/" + std::string(250, 'a') + "b_mtx";
    std::string na = Name(a.c_str()), nb = Name(b.c_str());
    ASSERT_NE("<fail>", na);
    EXPECT_LE(na.size(), static_cast<size_t>(NAME_MAX));
    EXPECT_LE(nb.size(), static_cast<size_t>(NAME_MAX));
    EXPECT_NE(na, nb);
    EXPECT_EQ(na, Name(a.c_str()));  // the same name every time
    EXPECT_EQ(0u, na.rfind("/abcdefghijklmnopqrstuvwx.", 0));
}

TEST_F(Session, ABadWordRefusesEveryNameRatherThanReachTheRealSystem) {
    for (const char *bad : {"a/b", "with space", "dot.ted", "abcdefghijklmnopqrstuvwxy"}) {
        setenv(KT48HOST_SESSION_VARIABLE, bad, 1);
        int valid = 1;
        EXPECT_NE(nullptr, KT48Host_Session(&valid));
        EXPECT_EQ(0, valid) << bad;
        EXPECT_EQ("<fail>", Name("/KT48API_INIT")) << bad;
        EXPECT_EQ("<fail>", Name("/tmp/SHM/")) << bad;
    }
}

TEST_F(Session, ANameThatDoesNotFitIsRefused) {
    setenv(KT48HOST_SESSION_VARIABLE, "s1", 1);
    EXPECT_EQ("<fail>", Name("/KT48API_INIT", 8));
    unsetenv(KT48HOST_SESSION_VARIABLE);
    EXPECT_EQ("<fail>", Name("/KT48API_INIT", 8));
}

}  // namespace

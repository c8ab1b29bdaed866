#include "core/arch/posix/trustedpath_p.h"

#include <sys/stat.h>
#include <unistd.h>

#include "tests/support/checks.h"

namespace {

namespace fs = std::filesystem;

// out/plugins/x.so, all of it the user's.
struct TrustedPath : testing::Test {
    TrustedPath() {
        fs::create_directories(folder.file("out/plugins"));
        folder.write("out/plugins/x.so", "library");
        for (const char* name : {"out", "out/plugins", "out/plugins/x.so"}) mode(name, 0755);
    }
    std::string path(const std::string& name) const { return folder.file(name); }
    void mode(const std::string& name, mode_t bits) const { ASSERT_EQ(chmod(path(name).c_str(), bits), 0); }
    std::string reason(const std::string& name, QvLibraryTrust trust = QvLibraryTrust::owner) const {
        return qvFindLibrary(name, trust).reason;
    }

    TempFolder folder;
};

TEST_F(TrustedPath, WhoMayWrite) {
    const std::string file = path("out/plugins/x.so");
    const std::string plugins = "is in the folder '" + path("out/plugins") + "', ";
    const std::string out = "is in the folder '" + path("out") + "', ";
    const std::string write = "to which other users may write";
    ASSERT_EQ(reason(file), "");
    const gid_t own = getegid();
    const struct {
        const char* name;
        mode_t bits;
        uid_t owner;
        gid_t group;
        std::string reason;
    } cases[] = {
        {"out/plugins/x.so", 0644, geteuid(), own, ""},
        {"out/plugins/x.so", 0757, geteuid(), own, "can be written to by other users"},
        {"out/plugins", 0757, geteuid(), own, plugins + write},
        {"out/plugins", 01777, geteuid(), own, plugins + write},  // anybody may add a dependency
        {"out", 0757, geteuid(), own, out + write},
        {"out", 01777, geteuid(), own, ""},  // as /tmp: what is ours in it stays ours
        // Root alone can give files away, and only to users that its namespace knows.
        {"out/plugins/x.so", 0644, 12345, 0, "belongs to another user"},
        {"out/plugins", 0755, 12345, 0, plugins + "which belongs to another user"},
        {"out", 01755, 12345, 0, out + "which belongs to another user"},
        {"out/plugins/x.so", 0664, 0, 12345, "can be written to by other users"},
        {"out/plugins", 0775, 0, 12345, plugins + write},
        {"out", 0775, 0, 12345, out + write},
        {"out", 01775, 0, 12345, ""},
        {"out/plugins/x.so", 0644, 0, 12345, ""},
        {"out", 0775, 0, 0, ""},
    };
    for (const auto& c : cases) {
        const bool ours = c.owner == geteuid() && c.group == own;
        SCOPED_TRACE(testing::Message() << c.name << ' ' << std::oct << c.bits << ' ' << std::dec << c.owner);
        const bool given = chown(path(c.name).c_str(), c.owner, c.group) == 0;
        if (!ours && !given) continue;
        ASSERT_TRUE(given);
        mode(c.name, c.bits);
        EXPECT_EQ(reason(file), c.reason);
        EXPECT_EQ(reason(file, QvLibraryTrust::anyone), "");
        ASSERT_EQ(chown(path(c.name).c_str(), geteuid(), own), 0);
        mode(c.name, 0755);
    }
}

TEST_F(TrustedPath, LinksAreFollowedAndTheirFoldersChecked) {
    const std::string file = path("out/plugins/x.so");
    fs::create_directory(path("open"));
    fs::create_directory(path("safe"));
    mode("safe", 0755);
    fs::create_symlink("../out/plugins/x.so", path("open/link.so"));
    fs::create_symlink("../open/link.so", path("safe/link.so"));
    fs::create_symlink(path("out") + "/plugins", path("safe/folder"));
    fs::create_symlink("itself.so", path("safe/itself.so"));
    fs::create_symlink("nothing", path("safe/dangling.so"));
    mode("open", 0755);
    for (const char* name :
         {"open/link.so", "safe/link.so", "safe/folder/x.so", "safe/.././out//plugins/x.so"})
        EXPECT_EQ(qvFindLibrary(path(name), QvLibraryTrust::owner).name, file) << name;
    mode("open", 0777);
    const std::string open = "is in the folder '" + path("open") + "', to which other users may write";
    EXPECT_EQ(reason(path("open/link.so")), open);
    EXPECT_EQ(reason(path("safe/link.so")), open);
    EXPECT_EQ(qvFindLibrary(path("safe/link.so"), QvLibraryTrust::anyone).name, file);
    ASSERT_EQ(mkfifo(path("safe/pipe.so").c_str(), 0600), 0);
    const struct {
        const char *name, *reason;
    } cases[] = {
        {"safe/pipe.so", "is a pipe"},
        {"safe/dangling.so", "is a link that leads nowhere"},
        {"safe/folder/y.so", "does not exist"},
        {"safe/itself.so", "can't be opened: Too many levels of symbolic links"},
        {"out/plugins/x.so/y.so", "can't be opened: Not a directory"},
        {"safe/folder", "is a folder"},
        {"safe/..", "is a folder"},
    };
    for (const auto& c : cases) EXPECT_EQ(reason(path(c.name)), c.reason);
    EXPECT_EQ(reason(""), "does not exist");
    EXPECT_EQ(reason("/"), "is a folder");
    if (lchown(path("safe/folder").c_str(), 12345, 0) != 0) GTEST_SKIP() << "may not give files away";
    EXPECT_EQ(reason(path("safe/folder/x.so")),
              "is reached by the link '" + path("safe/folder") + "', which belongs to another user");
}

}  // namespace

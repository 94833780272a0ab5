// The configuration manager over a file in a fresh temporary directory.
#include "config/ConfigManager_qvini.h"
#include "config/IniTestSupport.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <thread>
#include <vector>

using namespace qv_ini_test;
using ph_fwk::ConfigManager_qvini;

namespace {

// Whether this process can start threads: a child tries, so that a crash stays there. (Under
// qemu-arm with a sysroot whose ld.so does not match the multiarch libc, pthread_create
// crashes every program.)
bool ThreadsWork() {
    pid_t child = ::fork();
    if (child == 0) {
        std::thread probe([] {});
        probe.join();
        ::_exit(0);
    }
    int status = 0;
    return child > 0 && ::waitpid(child, &status, 0) == child && WIFEXITED(status) &&
           WEXITSTATUS(status) == 0;
}

struct stat StatOf(const std::string& path) {
    struct stat info {};
    EXPECT_EQ(::stat(path.c_str(), &info), 0) << path;
    return info;
}

// Moves the file's modification time to another second, as a rewrite a second later would.
void TouchLater(const std::string& path, int seconds) {
    struct stat info = StatOf(path);
    struct timespec times[2] = {{info.st_mtime + seconds, 0}, {info.st_mtime + seconds, 0}};
    ASSERT_EQ(::utimensat(AT_FDCWD, path.c_str(), times, 0), 0);
}

}  // namespace

TEST(ConfigManager, FirstUseWithoutFileThenSetCreatesIt) {
    TempDir dir;
    const std::string path = dir.File("qv-rt.ini");
    const mode_t old = ::umask(077);
    ConfigManager_qvini config(path);
    EXPECT_EQ(config.GetString("SYSTEMSETTINGS", "Host_Name", ""), "");
    EXPECT_EQ(config.GetInt("SYSTEMSETTINGS", "Port", 80), 80);
    EXPECT_FALSE(config.KeyExists("SYSTEMSETTINGS", "Host_Name"));
    EXPECT_TRUE(config.SetString("SYSTEMSETTINGS", "Host_Name", "target-1"));
    ::umask(old);
    EXPECT_EQ(ReadAll(path), "[SYSTEMSETTINGS]\nHost_Name=\"target-1\"\n\n");
    EXPECT_EQ(StatOf(path).st_mode & 07777, 0644u);
    EXPECT_EQ(config.GetString("systemsettings", "host_name", "x"), "target-1");

    // A second manager on the same file sees it.
    ConfigManager_qvini other(path);
    EXPECT_EQ(other.GetString("SYSTEMSETTINGS", "Host_Name", ""), "target-1");
    EXPECT_TRUE(other.SetInt("Net", "Port", -7));
    EXPECT_EQ(ReadAll(path), "[SYSTEMSETTINGS]\nHost_Name=\"target-1\"\n\n[Net]\nPort=-7\n\n");
}

TEST(ConfigManager, GettersCutsSpellingsAndDefaults) {
    TempDir dir;
    const std::string path = dir.File("c.ini");
    WriteAll(path, "[S]\nlong=" + std::string(2000, 'a') + "\njunk=12abc\nnum= 42 \n" +
                       "t1=TRUE\nt2=true\nt3=True\nf1=1\nf2=yes\nempty=\n");
    ConfigManager_qvini config(path);
    EXPECT_EQ(config.GetString("S", "long", ""), std::string(1023, 'a'));
    EXPECT_EQ(config.GetInt("S", "junk", -1), -1);
    EXPECT_EQ(config.GetInt("S", "num", -1), 42);
    for (const char* key : {"t1", "t2", "t3"}) {
        EXPECT_TRUE(config.GetBool("S", key, false)) << key;
    }
    for (const char* key : {"f1", "f2"}) {
        EXPECT_FALSE(config.GetBool("S", key, true)) << key;
    }
    EXPECT_TRUE(config.GetBool("S", "absent", true));
    EXPECT_FALSE(config.GetBool("S", "absent", false));
    EXPECT_EQ(config.GetString("S", "empty", "dflt"), "dflt");  // empty values are not kept

    // The base KeyExists walks the key iterator with strcasecmp (no trimming).
    EXPECT_TRUE(config.ConfigManager::KeyExists("S", "JUNK"));
    EXPECT_FALSE(config.ConfigManager::KeyExists("S", " junk"));
    EXPECT_FALSE(config.ConfigManager::KeyExists("missing", "junk"));
}

TEST(ConfigManager, RemoveWritesOnlyWhenSomethingWentAway) {
    TempDir dir;
    const std::string path = dir.File("r.ini");
    WriteAll(path, "[A]\nx=1\ny=2\n[B]\nz=3\n");
    ConfigManager_qvini config(path);
    const ino_t before = StatOf(path).st_ino;
    EXPECT_TRUE(config.RemoveKey("A", "absent"));
    EXPECT_TRUE(config.RemoveSection("absent"));
    EXPECT_EQ(StatOf(path).st_ino, before);  // not rewritten
    EXPECT_EQ(ReadAll(path), "[A]\nx=1\ny=2\n[B]\nz=3\n");

    EXPECT_TRUE(config.RemoveKey("a", "X"));
    EXPECT_NE(StatOf(path).st_ino, before);
    EXPECT_EQ(ReadAll(path), "[A]\ny=2\n[B]\nz=3\n");
    EXPECT_TRUE(config.SetIntOrRemove("A", "y", 5, 5));
    EXPECT_TRUE(config.SetBoolOrRemove("B", "flag", true, false));
    EXPECT_TRUE(config.RemoveSectionNoSave("b"));
    EXPECT_EQ(ReadAll(path), "[A]\n[B]\nz=3\nflag=\"TRUE\"\n");  // NoSave wrote nothing
    EXPECT_TRUE(config.Save());
    EXPECT_EQ(ReadAll(path), "[A]\n");

    // Clear leaves an empty file; later writes no longer compact blank lines.
    EXPECT_TRUE(config.Clear());
    EXPECT_EQ(ReadAll(path), "");
    EXPECT_TRUE(config.SetInt("N", "v", 1));
    EXPECT_EQ(ReadAll(path), "[N]\nv=1\n\n");
}

TEST(ConfigManager, RewritesByOthersAreSeen) {
    TempDir dir;
    const std::string path = dir.File("w.ini");
    WriteAll(path, "[S]\nHost_Name=first\n");
    ConfigManager_qvini config(path);
    EXPECT_EQ(config.GetString("S", "Host_Name", ""), "first");
    WriteAll(path, "[S]\nHost_Name=second\n");
    TouchLater(path, 3);
    EXPECT_EQ(config.GetString("S", "Host_Name", ""), "second");
    // A set re-reads first, so the other writer's keys survive.
    WriteAll(path, "[S]\nHost_Name=third\nOther=1\n");
    TouchLater(path, 6);
    EXPECT_TRUE(config.SetString("S", "Mine", "m"));
    EXPECT_EQ(ReadAll(path), "[S]\nHost_Name=third\nOther=1\nMine=\"m\"\n");
    // A file that disappears leaves what was read last.
    ASSERT_EQ(::unlink(path.c_str()), 0);
    EXPECT_EQ(config.GetString("S", "Other", ""), "1");

    // A failed write reports false and keeps the change in memory.
    ConfigManager_qvini nowhere(dir.File("no-such-dir/x.ini"));
    EXPECT_FALSE(nowhere.SetString("S", "k", "v"));
    EXPECT_EQ(nowhere.GetString("S", "k", ""), "v");
    EXPECT_FALSE(nowhere.Save());
    EXPECT_FALSE(nowhere.SetString("S", "bad\nname", "v"));
}

TEST(ConfigManager, IteratorsAndLists) {
    TempDir dir;
    const std::string path = dir.File("i.ini");
    WriteAll(path, "[One]\na=1\nb=2\n[Two]\n[Three]\nc=3\n");
    ConfigManager_qvini config(path);
    auto keys = config.GetKeyIterator("missing");
    EXPECT_TRUE(keys->AtEnd());
    EXPECT_FALSE(keys->Next());
    EXPECT_EQ(keys->Key(), "");

    std::vector<std::string> names;
    for (auto it = config.GetSectionIterator(); !it->AtEnd(); it->Next()) {
        names.push_back(it->Name());
    }
    // [Two] has no keys but is still a section.
    EXPECT_EQ(names, (std::vector<std::string>{"One", "Two", "Three"}));

    keys = config.GetKeyIterator("one");
    config.SetIntNoSave("One", "a", 9);  // the iterator holds copies
    ASSERT_FALSE(keys->AtEnd());
    EXPECT_EQ(keys->Key() + "=" + keys->Value(), "a=1");
    EXPECT_TRUE(keys->Next());
    EXPECT_EQ(keys->Key() + "=" + keys->Value(), "b=2");
    EXPECT_TRUE(keys->Next());
    EXPECT_TRUE(keys->AtEnd());
    EXPECT_FALSE(keys->Next());

    const std::vector<std::string> list{"a", "", "b c"};
    EXPECT_TRUE(config.SetStringList("L", "list", list, ','));
    EXPECT_EQ(config.GetString("L", "list", ""), "a,,b c,");
    EXPECT_EQ(config.GetStringList("L", "list", {}, ','), list);
    EXPECT_EQ(config.GetStringList("L", "absent", {"d"}, ','), std::vector<std::string>{"d"});
    EXPECT_TRUE(config.SetStringListNoSave("L", "empty", {}, ','));
    EXPECT_TRUE(config.GetStringList("L", "empty", {"d"}, ',').empty());
    EXPECT_EQ(ph_fwk::ConfigManager::SplitList("x,,y", ','),
              (std::vector<std::string>{"x", "", "y"}));
    EXPECT_TRUE(config.SetStringOrRemoveNoSave("L", "list", "same", "same"));
    EXPECT_FALSE(config.KeyExists("L", "list"));
}

TEST(ConfigManager, ConcurrentCallersAreSerialised) {
    if (!ThreadsWork()) {
        GTEST_SKIP() << "threads cannot start in this environment (emulator set-up)";
    }
    TempDir dir;
    const std::string path = dir.File("t.ini");
    ConfigManager_qvini config(path);
    std::vector<std::thread> threads;
    for (int t = 0; t < 4; ++t) {
        threads.emplace_back([&config, t] {
            const std::string section = "T" + std::to_string(t);
            for (int i = 0; i < 50; ++i) {
                config.SetIntNoSave(section, "k" + std::to_string(i), i);
                config.GetInt(section, "k0", -1);
                if (i % 10 == 0) {
                    config.Save();
                    config.GetSectionIterator();
                }
            }
        });
    }
    for (auto& thread : threads) {
        thread.join();
    }
    EXPECT_TRUE(config.Save());
    ConfigManager_qvini reread(path);
    for (int t = 0; t < 4; ++t) {
        EXPECT_EQ(reread.GetInt("T" + std::to_string(t), "k49", -1), 49);
    }
    EXPECT_EQ(&ph_fwk::GetSystemConfig(), &ph_fwk::GetSystemConfig());
}

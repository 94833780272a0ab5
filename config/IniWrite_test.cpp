// The writers: modes and owners of replaced files, temporary names, failures that must leave
// the target alone, long values split into " LineNNNN" keys, streams and the change check.
#include "config/IniTestSupport.h"

#include <gtest/gtest.h>

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <set>

using namespace qv_ini_test;

namespace {

std::set<std::string> Entries(const std::string& dir) {
    std::set<std::string> names;
    if (DIR* d = ::opendir(dir.c_str())) {
        while (dirent* e = ::readdir(d)) {
            std::string name = e->d_name;
            if (name != "." && name != "..") {
                names.insert(name);
            }
        }
        ::closedir(d);
    }
    return names;
}

mode_t ModeOf(const std::string& path) {
    struct stat info {};
    ::stat(path.c_str(), &info);
    return info.st_mode & 07777;
}

// Sets the process umask for one scope.
class Umask {
public:
    explicit Umask(mode_t mask) : m_old(::umask(mask)) {}
    ~Umask() { ::umask(m_old); }

private:
    mode_t m_old;
};

}  // namespace

TEST(IniWrite, ModesOwnersAndTemporaryNames) {
    TempDir dir;
    Umask mask(077);
    for (uint32_t flags : {0x36u, 0x22u, 0x20u}) {
        SCOPED_TRACE(flags);
        std::string path = dir.File("cfg" + std::to_string(flags) + ".ini");
        Store store = NewStore();
        IniSetWriteOptions(store.get(), -1, 0, flags);
        IniSetString(store.get(), "S", "k", "v1");
        // A new file is 0644 whatever the umask (the direct writer follows the umask).
        ASSERT_EQ(IniWriteFile(store.get(), path.c_str()), 0);
        EXPECT_EQ(ModeOf(path), flags & kIniWriteViaTemp ? 0644u : 0600u);
        EXPECT_EQ(ReadAll(path), "[S]\nk=\"v1\"\n\n");

        // An existing file keeps its mode, owner and group.
        ASSERT_EQ(::chmod(path.c_str(), 0640), 0);
        const bool root = ::geteuid() == 0;
        if (root) {
            ASSERT_EQ(::chown(path.c_str(), 1234, 5678), 0);
        }
        IniSetString(store.get(), "S", "k", "v2");
        ASSERT_EQ(IniWriteFile(store.get(), path.c_str()), 0);
        EXPECT_EQ(ReadAll(path), "[S]\nk=\"v2\"\n\n");
        EXPECT_EQ(ModeOf(path), 0640u);
        struct stat info {};
        ASSERT_EQ(::stat(path.c_str(), &info), 0);
        if (root) {
            EXPECT_EQ(info.st_uid, 1234u);
            EXPECT_EQ(info.st_gid, 5678u);
        }
        EXPECT_EQ(IniFileChanged(store.get()), 0);
    }
    // No temporary file is left behind.
    EXPECT_EQ(Entries(dir.Path()), (std::set<std::string>{"cfg32.ini", "cfg34.ini", "cfg54.ini"}));

    // The "TMP" name: the extension replaced, or ".TMP" appended; a stale one is overwritten.
    Store store = NewStore();
    IniSetWriteOptions(store.get(), -1, 0, 0x02);
    IniSetString(store.get(), "S", "k", "v");
    WriteAll(dir.File("noext.TMP"), "stale");
    ASSERT_EQ(IniWriteFile(store.get(), dir.File("noext").c_str()), 0);
    ASSERT_EQ(IniWriteFile(store.get(), dir.File("x.TMP").c_str()), 0);
    EXPECT_EQ(Entries(dir.Path()).count("noext.TMP"), 0u);
    EXPECT_EQ(Entries(dir.Path()).count("x.TMP.TMP"), 0u);
    EXPECT_EQ(ReadAll(dir.File("x.TMP")), "[S]\nk=\"v\"\n\n");
}

TEST(IniWrite, FailuresLeaveTheTargetAlone) {
    TempDir dir;
    const std::string path = dir.File("keep.ini");
    WriteAll(path, "[Old]\nk=1\n");
    Store store = NewStore();
    ASSERT_EQ(IniLoadFile(store.get(), path.c_str()), 0);
    IniStore* s = store.get();
    EXPECT_EQ(IniWriteFile(s, ""), kIniInvalid);
    EXPECT_EQ(IniWriteFile(s, nullptr), kIniInvalid);

    const std::string nowhere = dir.File("missing-dir/x.ini");
    for (uint32_t flags : {0x36u, 0x02u}) {
        IniSetWriteOptions(s, -1, 0, flags);
        EXPECT_EQ(IniWriteFile(s, nowhere.c_str()), kIniCannotReplace);
    }
    IniSetWriteOptions(s, -1, 0, 0x00);
    EXPECT_EQ(IniWriteFile(s, nowhere.c_str()), kIniCannotCreate);
    // A directory as target cannot be opened for update.
    IniSetWriteOptions(s, -1, 0, 0x36);
    EXPECT_EQ(IniWriteFile(s, dir.Path().c_str()), kIniCannotReplace);

    // A value that cannot be split fails before any file is touched, with or without a
    // temporary file.
    IniSetValue(s, "Old", "AVeryLongKeyName", "some value", 0);
    for (uint32_t flags : {0x36u, 0x00u}) {
        IniSetWriteOptions(s, 20, 0, flags);
        EXPECT_EQ(IniWriteFile(s, path.c_str()), kIniCannotSplit);
        EXPECT_EQ(ReadAll(path), "[Old]\nk=1\n");
    }
    EXPECT_EQ(Entries(dir.Path()), std::set<std::string>{"keep.ini"});
    EXPECT_EQ(IniSetWriteOptions(s, 80, 128, 0), kIniNotInt);
    EXPECT_EQ(IniSetWriteOptions(s, 80, -1, 0), kIniNotInt);
}

TEST(IniWrite, LongValuesSplitIntoContinuationKeys) {
    TempDir dir;
    const std::string path = dir.File("long.ini");
    const std::string list = "alpha,beta,gamma,delta,epsilon,zeta,eta,theta";
    const std::string words = "aaaa bbbb cccc dddd eeee ffff";
    Store store = NewStore();
    IniStore* s = store.get();
    IniSetValue(s, "L", "List", list.c_str(), 0);
    IniSetString(s, "Q", "List", list.c_str());
    IniSetValue(s, "W", "W", words.c_str(), 0);
    IniSetWriteOptions(s, 40, ',', 0);
    ASSERT_EQ(IniWriteFile(s, path.c_str()), 0);
    std::string expected =
        "[L]\nList Line0001=alpha,beta,gamma,delta,\nList Line0002=epsilon,zeta,eta,theta\n\n"
        "[Q]\nList Line0001=\"alpha,beta,gamma,\"\nList Line0002=\"delta,epsilon,zeta,\"\n"
        "List Line0003=\"eta,theta\"\n\n"
        "[W]\nW=aaaa bbbb cccc dddd eeee ffff\n\n";
    EXPECT_EQ(ReadAll(path), expected);

    // Split at blanks, an unquoted piece would lose its edge blanks when read back.
    IniSetWriteOptions(s, 30, ' ', 0);
    IniDeleteSection(s, "Q");
    ASSERT_EQ(IniWriteFile(s, path.c_str()), 0);
    EXPECT_NE(ReadAll(path).find("W Line0001=aaaa bbbb ccc\nW Line0002=c dddd eeee ffff\n"),
              std::string::npos);

    Store reread = NewStore();
    ASSERT_EQ(IniLoadFile(reread.get(), path.c_str()), 0);
    const char* value = nullptr;
    ASSERT_EQ(IniGetValue(reread.get(), "L", "List", &value), 1);
    EXPECT_EQ(value, list);
    ASSERT_EQ(IniGetValue(reread.get(), "W", "W", &value), 1);
    EXPECT_EQ(value, words);
}

TEST(IniWrite, StreamsAndChangeCheck) {
    TempDir dir;
    const std::string path = dir.File("s.ini");
    Store store = NewStore();
    IniStore* s = store.get();
    EXPECT_EQ(IniFileChanged(s), kIniNoPath);
    IniSetValue(s, "S", "k", "v", 0);
    IniSetWriteOptions(s, -1, 0, 0x02);
    std::unique_ptr<FILE, int (*)(FILE*)> stream(std::fopen(path.c_str(), "w+b"), &std::fclose);
    ASSERT_TRUE(stream);
    EXPECT_EQ(IniWriteStream(s, stream.get(), 0), kIniStreamMisuse);
    EXPECT_EQ(IniWriteStream(s, nullptr, 0), kIniInvalid);
    IniSetWriteOptions(s, -1, 0, 0x01);
    EXPECT_EQ(IniWriteStream(s, stream.get(), 0), 0);
    EXPECT_EQ(IniWriteStream(s, stream.get(), 1), 0);
    EXPECT_EQ(ReadAll(path), "\xEF\xBB\xBF[S]\nk=v\n\n\xEF\xBB\xBF[S]\nk=v\n\n");
    EXPECT_EQ(IniWriteStream(s, stream.get(), 0), 0);
    EXPECT_EQ(ReadAll(path), "\xEF\xBB\xBF[S]\nk=v\n\n");
    stream.reset();
    std::unique_ptr<FILE, int (*)(FILE*)> readOnly(std::fopen(path.c_str(), "rb"), &std::fclose);
    int rc = IniWriteStream(s, readOnly.get(), 0);
    EXPECT_TRUE(rc == kIniCannotReplace || rc == kIniStreamMisuse) << rc;

    // Reading a stream (here a pipe, which cannot seek) keeps what follows a BOM.
    std::unique_ptr<FILE, int (*)(FILE*)> pipe(::popen("printf '\\357\\273\\277[P]\\nk=1\\n'", "r"),
                                               &::pclose);
    ASSERT_TRUE(pipe);
    ASSERT_EQ(IniReadStream(s, pipe.get()), 0);
    EXPECT_EQ(IniKeyExists(s, "P", "k"), 1);
    EXPECT_EQ(IniFileChanged(s), kIniNoPath);  // a stream has no path

    ASSERT_EQ(IniLoadFile(s, path.c_str()), 0);
    EXPECT_EQ(IniFileChanged(s), 0);
    struct stat info {};
    ASSERT_EQ(::stat(path.c_str(), &info), 0);
    struct timespec times[2] = {{info.st_mtime + 5, 0}, {info.st_mtime + 5, 0}};
    ASSERT_EQ(::utimensat(AT_FDCWD, path.c_str(), times, 0), 0);
    EXPECT_EQ(IniFileChanged(s), 1);
    ASSERT_EQ(::unlink(path.c_str()), 0);
    EXPECT_EQ(IniFileChanged(s), kIniInvalid);
}

// Files the writer makes must read back into the same store (cases found by the INI
// round-trip fuzz target, fuzz/ini_roundtrip_fuzz.cpp).
TEST(IniWrite, WrittenFilesReadBackToTheSameStore) {
    TempDir dir;
    const std::string path = dir.File("r.ini");
    const char* value = nullptr;

    // An unquoted value cut into pieces: no piece may begin and end with one quote
    // character, or reading strips them. Cut at 7 bytes, "\"alpha\"" would be the first
    // piece of one value and "'xyz'" the last piece of the other.
    for (const std::string text : {"\"alpha\"1234567abcdefg", "1234567abcdefg'xyz'"}) {
        Store store = NewStore(0x06);
        IniSetValue(store.get(), "S", "k", text.c_str(), 0);
        IniSetWriteOptions(store.get(), 20, 0, 0);
        ASSERT_EQ(IniWriteFile(store.get(), path.c_str()), 0);
        EXPECT_NE(ReadAll(path).find("k Line0002="), std::string::npos);
        Store reread = NewStore(0x06);
        ASSERT_EQ(IniLoadFile(reread.get(), path.c_str()), 0);
        ASSERT_EQ(IniGetValue(reread.get(), "S", "k", &value), 1);
        EXPECT_EQ(value, text);
    }

    // A whole value without a quote character that begins and ends with a quote this
    // store's reader strips (joined from pieces, or set without quotes) is written between
    // one more pair of it; a quote the reader keeps is written as it is.
    {
        WriteAll(path, "[S]\nsi Line0001=\"aq\nsi Line0002=f\"\n");
        Store store = NewStore(0x06);
        ASSERT_EQ(IniLoadFile(store.get(), path.c_str()), 0);
        IniSetValue(store.get(), "S", "single", "'x'", 0);
        IniSetValue(store.get(), "S", "double", "\"y\"", 0);
        IniSetWriteOptions(store.get(), -1, 0, 0);
        ASSERT_EQ(IniWriteFile(store.get(), path.c_str()), 0);
        EXPECT_EQ(ReadAll(path), "[S]\nsi=\"\"aqf\"\"\nsingle=''x''\ndouble=\"\"y\"\"\n\n");
        Store reread = NewStore(0x06);
        ASSERT_EQ(IniLoadFile(reread.get(), path.c_str()), 0);
        for (const auto& [key, want] : {std::pair<const char*, const char*>{"si", "\"aqf\""},
                                        {"single", "'x'"},
                                        {"double", "\"y\""}}) {
            ASSERT_EQ(IniGetValue(reread.get(), "S", key, &value), 1) << key;
            EXPECT_EQ(std::string(value), want) << key;
        }
        Store keepsQuotes = NewStore(0x02);
        IniSetValue(keepsQuotes.get(), "S", "single", "'x'", 0);
        IniSetWriteOptions(keepsQuotes.get(), -1, 0, 0);
        ASSERT_EQ(IniWriteFile(keepsQuotes.get(), path.c_str()), 0);
        EXPECT_EQ(ReadAll(path), "[S]\nsingle='x'\n\n");
    }

    // Continuation keys with blanks before " Line" join under the trimmed base name, so the
    // key is found by its name and writes back as it was read.
    {
        WriteAll(path, "[S]\nPath  Line0001=/usr\nPath\t Line0002=/local\n");
        Store store = NewStore();
        ASSERT_EQ(IniLoadFile(store.get(), path.c_str()), 0);
        ASSERT_EQ(IniGetValue(store.get(), "S", "Path", &value), 1);
        EXPECT_EQ(std::string(value), "/usr/local");
        ASSERT_EQ(IniKeyName(store.get(), "S", 1, &value), 1);
        EXPECT_EQ(std::string(value), "Path");
        IniSetWriteOptions(store.get(), -1, 0, 0);
        ASSERT_EQ(IniWriteFile(store.get(), path.c_str()), 0);
        EXPECT_EQ(ReadAll(path), "[S]\nPath=/usr/local\n\n");
    }

    // A header-less "(null)" section whose first key begins with the bytes of a byte order
    // mark: FF FE made the file unreadable (-3), EF BB BF was skipped and the key renamed.
    for (const char* key : {"\xFF\xFEkey", "\xFE\xFFkey", "\xEF\xBB\xBFkey"}) {
        Store store = NewStore(0x08);
        IniSetValue(store.get(), "(null)", key, "v", 0);
        IniSetWriteOptions(store.get(), -1, 0, 0);
        ASSERT_EQ(IniWriteFile(store.get(), path.c_str()), 0);
        Store reread = NewStore(0x08);
        ASSERT_EQ(IniLoadFile(reread.get(), path.c_str()), 0);
        EXPECT_EQ(Dump(reread.get()), "[(null)] @-1\n" + std::string(key) + "=v @1\n");
    }
}

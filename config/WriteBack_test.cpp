// Write-back safety: a child process rewrites the file through the configuration manager in
// a loop and is killed with SIGKILL at random moments. After every kill the file must hold one
// complete version (the last acknowledged one or the next), with its mode and owner intact,
// and a temporary file left behind must be no more readable than the target.
#include "config/IniTestSupport.h"

#include <gtest/gtest.h>

#include <dirent.h>
#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <spawn.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <random>
#include <string>
#include <vector>

extern char** environ;

using namespace qv_ini_test;

namespace {

constexpr int kKeys = 32;
const std::string kPadding(120, 'p');

std::string Expected(int version, int i) {
    return "v" + std::to_string(version) + "-" + std::to_string(i) + "-" + kPadding;
}

// The rewriter, run through the emulator when the tests run under one.
std::vector<std::string> RewriterCommand(const std::string& path) {
    std::vector<std::string> argv;
    std::string emulator = CONFIG_EMULATOR;
    for (size_t begin = 0; begin <= emulator.size();) {
        size_t end = emulator.find('|', begin);
        if (end == std::string::npos) {
            end = emulator.size();
        }
        if (end > begin) {
            argv.push_back(emulator.substr(begin, end - begin));
        }
        begin = end + 1;
    }
    argv.push_back(CONFIG_REWRITER);
    argv.push_back(path);
    return argv;
}

// One running rewriter: its pid and the read end of its acknowledgement pipe.
class Rewriter {
public:
    explicit Rewriter(const std::string& path) {
        int fds[2];
        if (::pipe2(fds, O_CLOEXEC) != 0) {
            return;
        }
        m_acks = fds[0];
        posix_spawn_file_actions_t actions;
        posix_spawn_file_actions_init(&actions);
        posix_spawn_file_actions_adddup2(&actions, fds[1], STDOUT_FILENO);
        std::vector<std::string> command = RewriterCommand(path);
        std::vector<char*> argv;
        for (auto& arg : command) {
            argv.push_back(&arg[0]);
        }
        argv.push_back(nullptr);
        if (::posix_spawnp(&m_pid, argv[0], &actions, nullptr, argv.data(), environ) != 0) {
            m_pid = -1;
        }
        posix_spawn_file_actions_destroy(&actions);
        ::close(fds[1]);
    }
    ~Rewriter() {
        Kill();
        if (m_acks >= 0) {
            ::close(m_acks);
        }
    }
    Rewriter(const Rewriter&) = delete;
    Rewriter& operator=(const Rewriter&) = delete;

    bool Started() const { return m_pid > 0 && m_acks >= 0; }

    // Waits for n more acknowledgements; false when the child ended or took too long.
    bool AwaitAcks(int n) {
        char byte;
        for (int i = 0; i < n; ++i) {
            pollfd p{m_acks, POLLIN, 0};
            if (::poll(&p, 1, 60000) != 1 || ::read(m_acks, &byte, 1) != 1) {
                return false;
            }
            ++m_acked;
        }
        return true;
    }

    // Kills the child and counts the acknowledgements it wrote before it died.
    int KillAndCount() {
        Kill();
        char buffer[256];
        ssize_t n;
        while ((n = ::read(m_acks, buffer, sizeof buffer)) > 0) {
            m_acked += static_cast<int>(n);
        }
        return m_acked;
    }

private:
    void Kill() {
        if (m_pid > 0) {
            ::kill(m_pid, SIGKILL);
            int status;
            ::waitpid(m_pid, &status, 0);
            m_pid = -1;
        }
    }

    pid_t m_pid = -1;
    int m_acks = -1;
    int m_acked = 0;
};

// The version the file holds, or -1 when it is not one complete version.
int CompleteVersion(const std::string& path) {
    Store store = NewStore();
    if (IniLoadFile(store.get(), path.c_str()) != 0) {
        return -1;
    }
    int32_t version = -1;
    if (IniGetInt(store.get(), "Data", "Version", &version) != 1 ||
        IniKeyCount(store.get(), "Data") != kKeys + 1) {
        return -1;
    }
    for (int i = 0; i < kKeys; ++i) {
        const char* value = nullptr;
        std::string key = "k" + std::to_string(i);
        if (IniGetValue(store.get(), "Data", key.c_str(), &value) != 1 ||
            value != Expected(version, i)) {
            return -1;
        }
    }
    return version;
}

// Checks and removes temporary files that a kill left behind; returns how many there were.
int SweepTemporaries(const TempDir& dir, mode_t targetMode) {
    int found = 0;
    std::vector<std::string> names;
    if (DIR* d = ::opendir(dir.Path().c_str())) {
        while (dirent* e = ::readdir(d)) {
            names.push_back(e->d_name);
        }
        ::closedir(d);
    }
    for (const std::string& name : names) {
        if (name.rfind("ini$$.TMP", 0) != 0) {
            continue;
        }
        ++found;
        struct stat info {};
        if (::stat(dir.File(name).c_str(), &info) == 0) {
            EXPECT_EQ(info.st_mode & 077 & ~targetMode, 0u) << name << " readable by others";
        }
        ::unlink(dir.File(name).c_str());
    }
    return found;
}

}  // namespace

TEST(IniWriteBack, SurvivesSigkillAtRandomMoments) {
    TempDir dir;
    const std::string path = dir.File("qv-rt.ini");
    {
        Store store = NewStore();
        IniSetWriteOptions(store.get(), -1, 0, 0x36);
        for (int i = 0; i < kKeys; ++i) {
            IniSetString(store.get(), "Data", ("k" + std::to_string(i)).c_str(),
                         Expected(0, i).c_str());
        }
        IniSetInt(store.get(), "Data", "Version", 0);
        ASSERT_EQ(IniWriteFile(store.get(), path.c_str()), 0);
    }
    const mode_t mode = 0600;
    ASSERT_EQ(::chmod(path.c_str(), mode), 0);
    const bool root = ::geteuid() == 0;
    if (root) {
        ASSERT_EQ(::chown(path.c_str(), 1234, 5678), 0);
    }

    std::mt19937 random(20261206);
    int version = 0;
    int leftovers = 0;
    for (int round = 0; round < 200; ++round) {
        SCOPED_TRACE("round " + std::to_string(round));
        Rewriter child(path);
        ASSERT_TRUE(child.Started());
        ASSERT_TRUE(child.AwaitAcks(static_cast<int>(random() % 4)));
        // Spreads the kill over the next write; this synchronises nothing.
        const auto until =
            std::chrono::steady_clock::now() + std::chrono::microseconds(random() % 3000);
        while (std::chrono::steady_clock::now() < until) {
        }
        const int acked = child.KillAndCount();

        const int found = CompleteVersion(path);
        ASSERT_TRUE(found == version + acked || found == version + acked + 1)
            << "file holds version " << found << ", expected " << version + acked << " or "
            << version + acked + 1;
        version = found;
        struct stat info {};
        ASSERT_EQ(::stat(path.c_str(), &info), 0);
        EXPECT_EQ(info.st_mode & 07777, mode);
        if (root) {
            EXPECT_EQ(info.st_uid, 1234u);
            EXPECT_EQ(info.st_gid, 5678u);
        }
        leftovers += SweepTemporaries(dir, mode);
    }
    RecordProperty("versions", version);
    RecordProperty("interrupted_writes", leftovers);
    std::printf("200 kills: %d versions written, %d writes interrupted\n", version, leftovers);
}

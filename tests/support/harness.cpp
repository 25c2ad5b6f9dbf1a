#include "harness.h"

#include "kt48api.h"
#include "kt48host.h"

#include <dirent.h>
#include <fcntl.h>
#include <signal.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <sstream>

namespace kt48test {

namespace {

std::string g_runPrefix;  // "kt<pid>": every session of this run starts with it
int g_sessionCounter = 0;
int g_childCounter = 0;

const char *const kLogVariables[] = {"ORVANsLogMethod", "ORVANsLogMask", "ORVAPLog", "ORVAMcLog"};

std::vector<std::string> ListDir(const std::string &dir) {
    std::vector<std::string> names;
    if (DIR *d = opendir(dir.c_str())) {
        while (dirent *e = readdir(d)) {
            if (std::strcmp(e->d_name, ".") && std::strcmp(e->d_name, "..")) names.push_back(e->d_name);
        }
        closedir(d);
    }
    return names;
}

bool StartsWith(const std::string &s, const std::string &p) { return s.compare(0, p.size(), p) == 0; }

void RemoveTree(const std::string &path) {
    for (const std::string &n : ListDir(path)) unlink((path + "/" + n).c_str());
    rmdir(path.c_str());
}

// Objects of sessions starting with prefix.
std::vector<std::string> ObjectsWithPrefix(const std::string &prefix) {
    std::vector<std::string> found;
    for (const std::string &n : ListDir("/dev/shm"))
        if (StartsWith(n, prefix)) found.push_back("/dev/shm/" + n);
    for (const std::string &n : ListDir("/tmp"))
        if (StartsWith(n, "SHM." + prefix)) found.push_back("/tmp/" + n);
    return found;
}

void RemoveTempDir();

// Proves at the end of the run that no test left an object behind.
class LeftoverCheck : public ::testing::Environment {
public:
    void TearDown() override {
        std::vector<std::string> left = ObjectsWithPrefix(g_runPrefix);
        for (const std::string &p : left) ADD_FAILURE() << "left behind by the suite: " << p;
        RemoveTempDir();
    }
};

const ::testing::Environment *const g_leftoverCheck = [] {
    g_runPrefix = "kt" + std::to_string(getpid());
    return ::testing::AddGlobalTestEnvironment(new LeftoverCheck);
}();

bool ReadLine(int fd, std::string &out) {
    out.clear();
    char c;
    for (;;) {
        ssize_t n = read(fd, &c, 1);
        if (n == 0) return !out.empty();
        if (n < 0) {
            if (errno == EINTR) continue;
            return false;
        }
        if (c == '\n') return true;
        out.push_back(c);
    }
}

}  // namespace

std::vector<LogRecord> ParseLog(const std::string &raw) {
    std::vector<LogRecord> records;
    size_t pos = 0;
    while (pos < raw.size()) {
        size_t eol = raw.find('\n', pos);
        if (eol == std::string::npos) break;
        std::string header = raw.substr(pos, eol - pos);
        pos = eol + 1;
        if (header.empty() || header[0] != '#') continue;  // not a record (other output)
        LogRecord r;
        std::istringstream in(header.substr(1));
        in >> r.sink;
        size_t len = 0;
        std::string field;
        while (in >> field) {
            size_t eq = field.find('=');
            if (eq == std::string::npos) continue;
            std::string key = field.substr(0, eq), val = field.substr(eq + 1);
            if (key == "level" || key == "cat" || key == "id") r.level = std::atoi(val.c_str());
            else if (key == "func") r.function = val;
            else if (key == "line") r.line = std::atoi(val.c_str());
            else if (key == "value") r.value = std::atol(val.c_str());
            else if (key == "pid") r.pid = std::atoi(val.c_str());
            else if (key == "len") len = std::strtoul(val.c_str(), nullptr, 10);
        }
        if (pos + len > raw.size()) break;
        r.text = raw.substr(pos, len);
        pos += len + 1;  // the text and its closing newline
        records.push_back(r);
    }
    return records;
}

std::vector<LogRecord> Find(const std::vector<LogRecord> &records, const std::string &fragment,
                            const std::string &sink) {
    std::vector<LogRecord> out;
    for (const LogRecord &r : records)
        if (r.sink == sink && r.text.find(fragment) != std::string::npos) out.push_back(r);
    return out;
}

void Channel::Send(const std::string &line) const {
    std::string data = line + "\n";
    const char *p = data.data();
    size_t left = data.size();
    while (left > 0) {
        ssize_t n = write(out_, p, left);
        if (n < 0 && errno == EINTR) continue;
        if (n <= 0) return;
        p += n;
        left -= static_cast<size_t>(n);
    }
}

std::string Channel::Receive() const {
    std::string line;
    ReadLine(in_, line);
    return line;
}

Child::Child(const std::function<int(Channel &)> &body) { Start(nullptr, &body); }

Child::Child(const std::vector<std::string> &argv) {
    Start([argv] {
        std::vector<char *> args;
        for (const std::string &a : argv) args.push_back(const_cast<char *>(a.c_str()));
        args.push_back(nullptr);
        execv(args[0], args.data());
        _exit(127);
    }, nullptr);
}

void Child::Start(const std::function<void()> &exec, const std::function<int(Channel &)> *body) {
    int toChild[2], fromChild[2];
    if (pipe2(toChild, O_CLOEXEC) != 0 || pipe2(fromChild, O_CLOEXEC) != 0) std::abort();
    stderrPath_ = TempDir() + "/child" + std::to_string(getpid()) + "_" + std::to_string(++g_childCounter) + ".err";
    std::fflush(nullptr);
    pid_ = fork();
    if (pid_ < 0) std::abort();
    if (pid_ == 0) {
        int err = open(stderrPath_.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
        if (err >= 0) dup2(err, STDERR_FILENO);
        close(toChild[1]);
        close(fromChild[0]);
        if (exec) {
            // A program talks through fds 3 (from the parent) and 4 (to it).
            int in = fcntl(toChild[0], F_DUPFD_CLOEXEC, 100);
            int out = fcntl(fromChild[1], F_DUPFD_CLOEXEC, 100);
            dup2(in, 3);
            dup2(out, 4);
            exec();
        }
        Channel ch(toChild[0], fromChild[1]);
        int code = (*body)(ch);
        std::fflush(nullptr);
        _exit(code);
    }
    close(toChild[0]);
    close(fromChild[1]);
    channel_ = Channel(fromChild[0], toChild[1]);
}

Child::~Child() {
    if (status_ < 0 && pid_ > 0) {
        kill(pid_, SIGKILL);
        Wait();
    }
    close(channel_.in());
    close(channel_.out());
    unlink(stderrPath_.c_str());
}

int Child::Wait() {
    if (status_ >= 0) return status_;
    int st = 0;
    while (waitpid(pid_, &st, 0) < 0 && errno == EINTR) {
    }
    status_ = WIFEXITED(st) ? WEXITSTATUS(st) : 128 + WTERMSIG(st);
    return status_;
}

void Child::Kill(int signal) { kill(pid_, signal); }

std::string Child::Stderr() const {
    std::ifstream in(stderrPath_, std::ios::binary);
    std::ostringstream s;
    s << in.rdbuf();
    return s.str();
}

void SessionTest::SetUp() {
    session_ = g_runPrefix + "_" + std::to_string(++g_sessionCounter);
    setenv(KT48HOST_SESSION_VARIABLE, session_.c_str(), 1);
    for (const char *v : kLogVariables) unsetenv(v);
}

std::string SessionTest::SystemName(const std::string &target) const {
    char out[512];
    if (KT48Host_SystemName(target.c_str(), out, sizeof out) != 0) return "";
    return out;
}

std::vector<std::string> SessionTest::Leftovers() const {
    std::vector<std::string> found;
    for (const std::string &n : ListDir("/dev/shm"))
        if (StartsWith(n, session_ + ".")) found.push_back("/dev/shm/" + n);
    struct stat st;
    std::string listing = "/tmp/SHM." + session_;
    if (stat(listing.c_str(), &st) == 0) found.push_back(listing);
    return found;
}

void SessionTest::TearDown() {
    // The regions of the session go the way the start-up clean-up takes
    // them; the election object lasts until reboot by design, so the test
    // removes it itself. Anything else left is a leak.
    DeleteAllSharedMemory();
    shm_unlink(SystemName("/KT48API_INIT").c_str());
    std::vector<std::string> left = Leftovers();
    for (const std::string &p : left) {
        ADD_FAILURE() << "left behind: " << p;
        if (StartsWith(p, "/tmp/")) RemoveTree(p);
        else unlink(p.c_str());
    }
    for (const char *v : kLogVariables) unsetenv(v);
    unsetenv(KT48HOST_SESSION_VARIABLE);
}

std::string ProbePath() { return KT48_PROBE_PATH; }

namespace {
std::string &TempDirPath() {
    static std::string dir;
    return dir;
}
void RemoveTempDir() {
    if (!TempDirPath().empty()) RemoveTree(TempDirPath());
}
}  // namespace

std::string TempDir() {
    std::string &path = TempDirPath();
    if (path.empty()) {
        char tmpl[] = "/tmp/kt48test.XXXXXX";
        const char *d = mkdtemp(tmpl);
        if (d == nullptr) std::abort();
        path = d;
    }
    return path;
}


}  // namespace kt48test

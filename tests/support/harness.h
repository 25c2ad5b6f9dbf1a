// Test harness: sessions, child processes and log records.
//
// Every test runs in a session of its own (KT48_SESSION), so it never
// sees another test's objects or a system running on the machine. Library
// code that needs a process of its own runs in a forked child; parent and
// child talk through pipes, never through sleeps. A child's standard
// error (where the log goes by default) is captured for the parent.
#ifndef KT48_TEST_HARNESS_H
#define KT48_TEST_HARNESS_H

#include <gtest/gtest.h>
#include <sys/types.h>

#include <functional>
#include <string>
#include <vector>

namespace kt48test {

// One record of the platform log.
struct LogRecord {
    std::string sink;  // "QelLog", "NsLog" or "PLog"
    int level = 0;     // QelLog: level; NsLog: category; PLog: id
    std::string function;
    int line = 0;
    long value = 0;  // PLog only
    int pid = 0;
    std::string text;
};

std::vector<LogRecord> ParseLog(const std::string &raw);
// The records of `sink` whose text contains `fragment`.
std::vector<LogRecord> Find(const std::vector<LogRecord> &records, const std::string &fragment,
                            const std::string &sink = "QelLog");

// The two ends of a child's pipes, as seen from one side.
class Channel {
public:
    Channel() = default;
    Channel(int in, int out) : in_(in), out_(out) {}
    void Send(const std::string &line) const;  // one line
    std::string Receive() const;               // the next line, "" at end of file
    int in() const { return in_; }
    int out() const { return out_; }

private:
    int in_ = -1;
    int out_ = -1;
};

class Child {
public:
    // Runs body in a forked child with standard error captured; the
    // child's exit code is body's result.
    explicit Child(const std::function<int(Channel &)> &body);
    // Runs a program (argv[0] is its path) with standard error captured.
    explicit Child(const std::vector<std::string> &argv);
    ~Child();
    Child(const Child &) = delete;
    Child &operator=(const Child &) = delete;

    const Channel &channel() const { return channel_; }
    void Send(const std::string &line) const { channel_.Send(line); }
    std::string Receive() const { return channel_.Receive(); }
    pid_t pid() const { return pid_; }
    // Exit code, or 128 + signal number; waits for the end.
    int Wait();
    void Kill(int signal);
    std::string Stderr() const;
    std::vector<LogRecord> Log() const { return ParseLog(Stderr()); }

private:
    void Start(const std::function<void()> &exec, const std::function<int(Channel &)> *body);
    pid_t pid_ = -1;
    int status_ = -1;
    Channel channel_;
    std::string stderrPath_;
};

// Fixture of every test that touches system-wide names.
class SessionTest : public ::testing::Test {
protected:
    void SetUp() override;
    void TearDown() override;
    const std::string &session() const { return session_; }
    // The system-wide name of a target name in this test's session.
    std::string SystemName(const std::string &target) const;
    // Objects of this session still present: /dev/shm entries and the listing directory.
    std::vector<std::string> Leftovers() const;

private:
    std::string session_;
};

// Path of the probe program (a fresh process that runs library calls).
std::string ProbePath();
// Directory for this test run's temporary files.
std::string TempDir();

}  // namespace kt48test

#endif

// The host messaging library: delivery between processes, its statuses,
// node ownership and lifetime, sessions, load and the transmission log.
//
// Sending is done in children wherever it can be: a sender keeps its
// connections for the life of its process, and the test process must not
// carry one from a test into the next.

#include "harness.h"

#include "QelMsg_Client.h"
#include "kt48host.h"

#include <poll.h>
#include <pthread.h>
#include <sched.h>
#include <signal.h>
#include <sys/syscall.h>
#include <time.h>
#include <unistd.h>

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <memory>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

namespace {

using kt48test::Channel;
using kt48test::Child;

class Msg : public kt48test::SessionTest {};

constexpr unsigned short kNode = 100;
constexpr unsigned short kOtherNode = 101;

using Bytes = std::vector<unsigned char>;

// Every message differs from its neighbours all along its length, so a
// merged, split, truncated or reordered message cannot pass for another.
Bytes Pattern(int who, int seq, size_t size) {
    Bytes b(size);
    for (size_t i = 0; i < size; ++i)
        b[i] = static_cast<unsigned char>(who * 37 + seq * 101 + i * 7 + (i >> 8));
    return b;
}

int Register(unsigned short pno) {
    return QelMsg_RegisterNode_kt48(pno, static_cast<int>(getpid()), pthread_self());
}

int Send(unsigned long to, const Bytes &m) { return QelMsg_SendMessage_kt48(1, to, 0, m.data(), m.size()); }

int Receive(unsigned long node, bool blocking, Bytes &buffer, unsigned int *a, unsigned int *b) {
    return blocking ? QelMsg_ReceiveMessage(node, a, b, buffer.data(), buffer.size())
                    : QelMsg_ReceiveMessageNotBlocked(node, a, b, buffer.data(), buffer.size());
}

// Receives one message; "" when it is `want` from `from`, else what differed.
std::string ExpectMessage(unsigned long node, bool blocking, const Bytes &want, pid_t from) {
    Bytes buf(QELMSG_MAX_MESSAGE + 16, 0xEE);
    unsigned int a = 0, b = 0;
    int st = Receive(node, blocking, buf, &a, &b);
    std::ostringstream why;
    if (st != QELMSG_OK) why << "[status " << st << "]";
    else if (a != want.size()) why << "[length " << a << " for " << want.size() << "]";
    else if (std::memcmp(buf.data(), want.data(), want.size()) != 0) why << "[bytes differ in " << a << "]";
    else if (buf[a] != 0xEE) why << "[written past " << a << "]";
    else if (b != static_cast<unsigned int>(from)) why << "[sender " << b << " for " << from << "]";
    return why.str();
}

std::string ExpectEmpty(unsigned long node) {
    Bytes buf(64);
    int st = Receive(node, false, buf, nullptr, nullptr);
    return st == QELMSG_E_EMPTY ? "" : "[not empty: " + std::to_string(st) + "]";
}

// The one message waiting for node is `want` from `from`.
std::string ExpectOnly(unsigned long node, const Bytes &want, pid_t from) {
    std::string problems = ExpectMessage(node, false, want, from);
    return problems + ExpectEmpty(node);
}

std::string OkOr(const std::string &problems) { return problems.empty() ? "ok" : problems; }

// A child that registers kNode, says "ready" and stays until told to go.
int HoldNode(Channel &ch) {
    if (Register(kNode) != QELMSG_OK) return 1;
    ch.Send("ready");
    ch.Receive();
    return 0;
}

// A child that answers each "send <size>" with the status of one send to kNode.
int SendOnCommand(Channel &ch) {
    for (std::string line = ch.Receive(); !line.empty(); line = ch.Receive())
        ch.Send(std::to_string(Send(kNode, Pattern(2, 0, std::stoul(line.substr(5))))));
    return 0;
}

TEST_F(Msg, AnotherProcessReceivesEachMessageWholeAndInOrder) {
    const std::vector<size_t> queued = {1, 2, 3, 64, 1000, 4096, QELMSG_MAX_MESSAGE - 1, QELMSG_MAX_MESSAGE, 1};
    const std::vector<size_t> awaited = {QELMSG_MAX_MESSAGE, 7, 1};
    Child receiver([&](Channel &ch) {
        if (Register(kNode) != QELMSG_OK) return 1;
        ch.Send("ready");
        pid_t from = std::stoi(ch.Receive());
        // The first batch is queued before the receiver looks: non-blocking
        // receives find all of it and then nothing.
        std::string problems;
        for (size_t i = 0; i < queued.size(); ++i)
            problems += ExpectMessage(kNode, false, Pattern(1, static_cast<int>(i), queued[i]), from);
        problems += ExpectEmpty(kNode);
        ch.Send(OkOr(problems));
        // The second batch is sent while the receiver waits for it.
        problems.clear();
        for (size_t i = 0; i < awaited.size(); ++i)
            problems += ExpectMessage(kNode, true, Pattern(1, static_cast<int>(queued.size() + i), awaited[i]), from);
        problems += ExpectEmpty(kNode);
        ch.Send(OkOr(problems));
        return 0;
    });
    ASSERT_EQ("ready", receiver.Receive());
    Child sender([&](Channel &ch) {
        int seq = 0;
        for (const std::vector<size_t> *batch : {&queued, &awaited}) {
            ch.Receive();
            std::string statuses;
            for (size_t size : *batch) statuses += std::to_string(Send(kNode, Pattern(1, seq++, size))) + " ";
            ch.Send(statuses);
        }
        return 0;
    });
    sender.Send("go");
    EXPECT_EQ("0 0 0 0 0 0 0 0 0 ", sender.Receive());
    receiver.Send(std::to_string(sender.pid()));
    EXPECT_EQ("ok", receiver.Receive());
    sender.Send("go");
    EXPECT_EQ("0 0 0 ", sender.Receive());
    EXPECT_EQ("ok", receiver.Receive());
    EXPECT_EQ(0, sender.Wait());
    EXPECT_EQ(0, receiver.Wait());
}

TEST_F(Msg, BadArgumentsAreRefusedAndTouchNeitherQueueNorNode) {
    Child c([](Channel &ch) {
        if (Register(kNode) != QELMSG_OK) return 1;
        std::ostringstream out;
        unsigned char byte = 'm';
        Bytes tooLong(QELMSG_MAX_MESSAGE + 1, 1);
        // Sent to a live node, so a refusal cannot be for want of a receiver.
        out << "null=" << QelMsg_SendMessage_kt48(1, kNode, 0, nullptr, 1)
            << " zero=" << QelMsg_SendMessage_kt48(1, kNode, 0, &byte, 0)
            << " long=" << QelMsg_SendMessage_kt48(1, kNode, 0, tooLong.data(), tooLong.size())
            << " to0=" << QelMsg_SendMessage_kt48(1, 0, 0, &byte, 1)
            << " to65536=" << QelMsg_SendMessage_kt48(1, 65536ul + kNode, 0, &byte, 1);
        // A message waits, so a refused receive cannot be for want of one.
        out << " send=" << QelMsg_SendMessage_kt48(1, kNode, 0, &byte, 1);
        unsigned char buf[8];
        unsigned int a, b;
        for (int blocking = 0; blocking < 2; ++blocking) {
            auto rx = blocking ? QelMsg_ReceiveMessage : QelMsg_ReceiveMessageNotBlocked;
            out << " rxnull=" << rx(kNode, &a, &b, nullptr, sizeof buf) << " rxzero=" << rx(kNode, &a, &b, buf, 0)
                << " rx0=" << rx(0, &a, &b, buf, sizeof buf) << " rx65536=" << rx(65536ul + kNode, &a, &b, buf, sizeof buf);
        }
        out << " reg0=" << QelMsg_RegisterNode_kt48(0, static_cast<int>(getpid()), pthread_self())
            << " regpid=" << QelMsg_RegisterNode_kt48(kOtherNode, static_cast<int>(getppid()), pthread_self());
        // Only the one good message went in, and it is still there.
        out << " " << OkOr(ExpectOnly(kNode, Bytes{'m'}, getpid()));
        // The refused registration left kOtherNode unowned.
        out << " rxother=" << QelMsg_ReceiveMessageNotBlocked(kOtherNode, &a, &b, buf, sizeof buf);
        ch.Send(out.str());
        return 0;
    });
    EXPECT_EQ("null=-1 zero=-1 long=-1 to0=-1 to65536=-1 send=0"
              " rxnull=-1 rxzero=-1 rx0=-1 rx65536=-1 rxnull=-1 rxzero=-1 rx0=-1 rx65536=-1"
              " reg0=-1 regpid=-1 ok rxother=-5",
              c.Receive());
    EXPECT_EQ(0, c.Wait());
}

TEST_F(Msg, MessageLargerThanTheBufferIsDroppedAndTheNextOneArrives) {
    const std::vector<size_t> sizes = {17, 16, 1000, 1};
    Child receiver([&](Channel &ch) {
        if (Register(kNode) != QELMSG_OK) return 1;
        ch.Send("ready");
        pid_t from = std::stoi(ch.Receive());
        std::ostringstream out;
        for (int blocking = 1; blocking >= 0; --blocking) {
            int first = blocking ? 0 : 2;
            Bytes buf(16);
            unsigned int a = 0, b = 0;
            int st = Receive(kNode, blocking, buf, &a, &b);
            out << st << " " << a << " ";
            // buf holds 16 bytes: the next message fits exactly or is smaller.
            Bytes next = Pattern(3, first + 1, sizes[first + 1]);
            st = Receive(kNode, blocking, buf, &a, &b);
            out << st << " " << a << " "
                << (std::memcmp(buf.data(), next.data(), next.size()) == 0 && b == static_cast<unsigned>(from))
                << " ";
        }
        out << OkOr(ExpectEmpty(kNode));
        ch.Send(out.str());
        return 0;
    });
    ASSERT_EQ("ready", receiver.Receive());
    Child sender([&](Channel &ch) {
        std::string statuses;
        for (size_t i = 0; i < sizes.size(); ++i) statuses += std::to_string(Send(kNode, Pattern(3, static_cast<int>(i), sizes[i])));
        ch.Send(statuses);
        return 0;
    });
    EXPECT_EQ("0000", sender.Receive());
    receiver.Send(std::to_string(sender.pid()));
    // The status names the length the message had.
    EXPECT_EQ("-3 17 0 16 1 -3 1000 0 1 1 ok", receiver.Receive());
    EXPECT_EQ(0, receiver.Wait());
}

TEST_F(Msg, FullQueueRefusesSendsUntilTheReceiverDrainsIt) {
    constexpr int kBound = 100000;
    Child receiver([](Channel &ch) {
        if (Register(kNode) != QELMSG_OK) return 1;
        ch.Send("ready");
        std::istringstream in(ch.Receive());
        int count = 0;
        pid_t from = 0;
        in >> count >> from;
        std::string problems;
        for (int i = 0; i < count && problems.empty(); ++i)
            problems += ExpectMessage(kNode, false, Pattern(4, i, 64), from);
        problems += ExpectEmpty(kNode);
        ch.Send(OkOr(problems));
        ch.Receive();
        problems = ExpectMessage(kNode, true, Pattern(4, count, 64), from);
        ch.Send(OkOr(problems));
        return 0;
    });
    ASSERT_EQ("ready", receiver.Receive());
    Child sender([](Channel &ch) {
        int sent = 0, st = QELMSG_OK;
        while (sent < kBound && (st = Send(kNode, Pattern(4, sent, 64))) == QELMSG_OK) ++sent;
        ch.Send(std::to_string(sent) + " " + std::to_string(st) + " " + std::to_string(Send(kNode, Pattern(4, sent, 64))));
        ch.Receive();
        ch.Send(std::to_string(Send(kNode, Pattern(4, sent, 64))));
        return 0;
    });
    std::istringstream report(sender.Receive());
    int sent = 0, first = 0, again = 0;
    report >> sent >> first >> again;
    EXPECT_EQ(QELMSG_E_FULL, first) << "after " << sent << " sends";
    EXPECT_EQ(QELMSG_E_FULL, again) << "a full queue stays full while nobody reads";
    EXPECT_GT(sent, 10) << "a node holds more than a POSIX queue would";
    receiver.Send(std::to_string(sent) + " " + std::to_string(sender.pid()));
    EXPECT_EQ("ok", receiver.Receive()) << "every accepted message, none of the refused";
    sender.Send("again");
    EXPECT_EQ("0", sender.Receive());
    receiver.Send("receive");
    EXPECT_EQ("ok", receiver.Receive());
    EXPECT_EQ(0, sender.Wait());
    EXPECT_EQ(0, receiver.Wait());
}

TEST_F(Msg, OnlyTheRegisteringProcessReceivesAndAReRegistrationKeepsTheNode) {
    ASSERT_EQ(QELMSG_OK, Register(kNode));
    // A forked child is not the receiver of its parent's node but can send to it.
    Child c([](Channel &ch) {
        Bytes buf(16);
        std::ostringstream out;
        out << Receive(kNode, false, buf, nullptr, nullptr) << " " << Receive(kNode, true, buf, nullptr, nullptr)
            << " " << QelMsg_UnregisterNode_kt48(kNode) << " " << Register(kNode) << " "
            << Send(kNode, Pattern(5, 0, 10));
        ch.Send(out.str());
        return 0;
    });
    EXPECT_EQ("-5 -5 -2 -6 0", c.Receive());
    EXPECT_EQ(0, c.Wait());
    EXPECT_EQ(QELMSG_OK, Register(kNode)) << "the same process again";
    EXPECT_EQ("", ExpectMessage(kNode, false, Pattern(5, 0, 10), c.pid())) << "the re-registration kept the queue";
    EXPECT_EQ(QELMSG_OK, QelMsg_UnregisterNode_kt48(kNode));
    EXPECT_EQ(QELMSG_E_NONODE, QelMsg_UnregisterNode_kt48(kNode));
    Bytes buf(16);
    EXPECT_EQ(QELMSG_E_NOTOWNER, Receive(kNode, false, buf, nullptr, nullptr));
}

TEST_F(Msg, APnoIsHeldWhileItsProcessLivesAndFreedWhenItIsKilled) {
    Child holder(HoldNode);
    ASSERT_EQ("ready", holder.Receive());
    Child sender(SendOnCommand);
    sender.Send("send 8");
    EXPECT_EQ("0", sender.Receive());
    EXPECT_EQ(QELMSG_E_REGISTERED, Register(kNode));

    holder.Kill(SIGKILL);
    EXPECT_EQ(128 + SIGKILL, holder.Wait());
    // A sender whose connection outlived the node, and one that never had one.
    sender.Send("send 8");
    EXPECT_EQ("-2", sender.Receive());
    sender.Send("send 8");
    EXPECT_EQ("-2", sender.Receive());
    Bytes m = Pattern(6, 0, 8);
    EXPECT_EQ(QELMSG_E_NONODE, Send(kNode, m));

    // The pno is free, and the old sender reaches whoever holds it now.
    ASSERT_EQ(QELMSG_OK, Register(kNode));
    sender.Send("send 9");
    EXPECT_EQ("0", sender.Receive());
    EXPECT_EQ("", ExpectMessage(kNode, false, Pattern(2, 0, 9), sender.pid()));
    // The holder changes under a connection that has not failed yet: the
    // very next send reaches the new node.
    EXPECT_EQ(QELMSG_OK, QelMsg_UnregisterNode_kt48(kNode));
    ASSERT_EQ(QELMSG_OK, Register(kNode));
    sender.Send("send 10");
    EXPECT_EQ("0", sender.Receive());
    EXPECT_EQ("", ExpectMessage(kNode, false, Pattern(2, 0, 10), sender.pid()));
    EXPECT_EQ(QELMSG_OK, QelMsg_UnregisterNode_kt48(kNode));
    sender.Send("send 9");
    EXPECT_EQ("-2", sender.Receive()) << "withdrawn in a live process";
}

// Waits until thread tid sits in epoll_wait, where a receiver has taken its
// node and waits for traffic. The kernel's view is the only one that tells
// a waiting receiver from one about to look up its node.
bool InEpollWait(pid_t tid) {
    const std::string path = "/proc/self/task/" + std::to_string(tid) + "/syscall";
    timespec start, now;
    clock_gettime(CLOCK_MONOTONIC, &start);
    for (;;) {
        std::ifstream in(path);
        long nr = -1;
        in >> nr;
        if (nr == SYS_epoll_wait || nr == SYS_epoll_pwait) return true;
#ifdef SYS_epoll_pwait2
        if (nr == SYS_epoll_pwait2) return true;
#endif
        clock_gettime(CLOCK_MONOTONIC, &now);
        if (now.tv_sec - start.tv_sec > 10) return false;
        sched_yield();
    }
}

TEST_F(Msg, UnregisterReleasesABlockedReceiverWithStatusOne) {
    Child c([](Channel &ch) {
        if (Register(kNode) != QELMSG_OK) return 1;
        int status = -100;
        int done[2];
        if (pipe(done) != 0) return 2;
        std::thread waiter([&] {
            pid_t self = static_cast<pid_t>(syscall(SYS_gettid));
            if (write(done[1], &self, sizeof self) != static_cast<ssize_t>(sizeof self)) return;
            Bytes buf(64);
            status = Receive(kNode, true, buf, nullptr, nullptr);
            char c = 'r';
            if (write(done[1], &c, 1) != 1) return;
        });
        pid_t tid = 0;
        if (read(done[0], &tid, sizeof tid) != static_cast<ssize_t>(sizeof tid)) std::abort();
        bool waiting = InEpollWait(tid);
        // Unregistering waits for the receiver it releases. One that stays
        // blocked is the fault under test: report it rather than hang.
        int unregistered = -100;
        std::thread withdraw([&] { unregistered = QelMsg_UnregisterNode_kt48(kNode); });
        pollfd released{done[0], POLLIN, 0};
        if (poll(&released, 1, 10000) != 1) {
            ch.Send("still blocked");
            _exit(3);
        }
        waiter.join();
        withdraw.join();
        close(done[0]);
        close(done[1]);
        Bytes buf(64);
        std::ostringstream out;
        out << waiting << " " << unregistered << " " << status << " " << Receive(kNode, false, buf, nullptr, nullptr)
            << " " << Send(kNode, Pattern(7, 0, 4));
        ch.Send(out.str());
        return 0;
    });
    EXPECT_EQ("1 0 1 -5 -2", c.Receive());
    EXPECT_EQ(0, c.Wait());
}

TEST_F(Msg, ANodeIsReachableOnlyFromItsOwnSession) {
    Child receiver([](Channel &ch) {
        if (Register(kNode) != QELMSG_OK) return 1;
        ch.Send("ready");
        pid_t from = std::stoi(ch.Receive());
        ch.Send(OkOr(ExpectOnly(kNode, Pattern(8, 0, 32), from)));
        return 0;
    });
    ASSERT_EQ("ready", receiver.Receive());
    const std::string other = session() + "b";
    Child stranger([&](Channel &ch) {
        setenv(KT48HOST_SESSION_VARIABLE, other.c_str(), 1);
        // The pno is free in the other session, and its node there is a different one.
        int sent = Send(kNode, Pattern(8, 1, 32));
        int registered = Register(kNode);
        int own = Send(kNode, Pattern(8, 2, 32));
        std::string problems = ExpectOnly(kNode, Pattern(8, 2, 32), getpid());
        ch.Send(std::to_string(sent) + " " + std::to_string(registered) + " " + std::to_string(own) + " " + OkOr(problems));
        return 0;
    });
    EXPECT_EQ("-2 0 0 ok", stranger.Receive());
    Child neighbour([](Channel &ch) {
        ch.Send(std::to_string(Send(kNode, Pattern(8, 0, 32))));
        return 0;
    });
    EXPECT_EQ("0", neighbour.Receive());
    receiver.Send(std::to_string(neighbour.pid()));
    EXPECT_EQ("ok", receiver.Receive());
    EXPECT_EQ(0, stranger.Wait());
    EXPECT_EQ(0, neighbour.Wait());
    EXPECT_EQ(0, receiver.Wait());
}

TEST_F(Msg, MessagesOfManySendersArriveExactlyOnceInEachSendersOrder) {
    constexpr int kSenders = 4;
    constexpr int kQueued = 100;   // per sender, all in flight before the receiver reads
    constexpr int kStreamed = 1000;  // per sender, while the receiver reads
    constexpr size_t kSize = 64;
    struct Header {
        int32_t who;
        int32_t seq;
    };
    auto message = [](int who, int seq) {
        Bytes m = Pattern(who, seq, kSize);
        Header h{who, seq};
        std::memcpy(m.data(), &h, sizeof h);
        return m;
    };
    Child receiver([&](Channel &ch) {
        if (Register(kNode) != QELMSG_OK) return 1;
        ch.Send("ready");
        std::istringstream in(ch.Receive());
        std::vector<unsigned int> pid(kSenders);
        for (unsigned int &p : pid) in >> p;
        std::vector<int> next(kSenders, 0);
        std::ostringstream problem;
        Bytes buf(2 * kSize);
        for (int k = 0; k < kSenders * (kQueued + kStreamed) && problem.str().empty(); ++k) {
            unsigned int a = 0, b = 0;
            int st = Receive(kNode, true, buf, &a, &b);
            Header h{};
            std::memcpy(&h, buf.data(), sizeof h);
            if (st != QELMSG_OK || a != kSize) problem << "status " << st << " length " << a;
            else if (h.who < 0 || h.who >= kSenders || b != pid[h.who]) problem << "sender " << h.who << " pid " << b;
            else if (h.seq != next[h.who]) problem << "sender " << h.who << " seq " << h.seq << " for " << next[h.who];
            else if (std::memcmp(buf.data(), message(h.who, h.seq).data(), kSize) != 0) problem << "bytes of " << h.who << "/" << h.seq;
            else ++next[h.who];
        }
        std::string out = OkOr(problem.str() + ExpectEmpty(kNode));
        for (int n : next) out += " " + std::to_string(n);
        ch.Send(out);
        return 0;
    });
    ASSERT_EQ("ready", receiver.Receive());
    std::vector<std::unique_ptr<Child>> senders;
    for (int who = 0; who < kSenders; ++who) {
        senders.push_back(std::make_unique<Child>([&, who](Channel &ch) {
            int seq = 0;
            ch.Receive();
            for (; seq < kQueued; ++seq)
                if (int st = QelMsg_SendMessage_kt48(1, kNode, 0, message(who, seq).data(), kSize)) return 10 - st;
            ch.Send("queued");
            ch.Receive();
            // The receiver drains as we go: a full queue only asks us to retry.
            for (long refused = 0; seq < kQueued + kStreamed && refused < 10000000;) {
                int st = QelMsg_SendMessage_kt48(1, kNode, 0, message(who, seq).data(), kSize);
                if (st == QELMSG_OK) {
                    ++seq;
                } else if (st == QELMSG_E_FULL) {
                    ++refused;
                    sched_yield();
                } else {
                    return 10 - st;
                }
            }
            return seq == kQueued + kStreamed ? 0 : 9;
        }));
    }
    for (auto &s : senders) s->Send("go");
    for (auto &s : senders) EXPECT_EQ("queued", s->Receive());
    std::string pids;
    for (auto &s : senders) pids += std::to_string(s->pid()) + " ";
    receiver.Send(pids);
    for (auto &s : senders) s->Send("go");
    for (auto &s : senders) EXPECT_EQ(0, s->Wait());
    std::string counts;
    for (int i = 0; i < kSenders; ++i) counts += " " + std::to_string(kQueued + kStreamed);
    EXPECT_EQ("ok" + counts, receiver.Receive());
    EXPECT_EQ(0, receiver.Wait());
}

TEST_F(Msg, TransmissionLogRecordsSendsWhileSwitchedOn) {
    Child c([](Channel &ch) {
        if (Register(kNode) != QELMSG_OK) return 1;
        std::string statuses = std::to_string(Send(kNode, Pattern(9, 0, 4)));
        qelmsg::QelMsg_DetermineTransmitLogging("on");
        statuses += std::to_string(QelMsg_SendMessage_kt48(7, kNode, 0x0A02, Pattern(9, 1, 5).data(), 5));
        qelmsg::QelMsg_DetermineTransmitLogging("off");
        statuses += std::to_string(Send(kNode, Pattern(9, 2, 6)));
        std::string problems;
        for (int i = 0; i < 3; ++i) problems += ExpectMessage(kNode, false, Pattern(9, i, 4 + i), getpid());
        ch.Send(statuses + " " + OkOr(problems));
        return 0;
    });
    EXPECT_EQ("000 ok", c.Receive());
    EXPECT_EQ(0, c.Wait());
    std::vector<kt48test::LogRecord> sends;
    for (const kt48test::LogRecord &r : kt48test::Find(c.Log(), ""))
        if (r.function == "QelMsg_SendMessage_kt48") sends.push_back(r);
    ASSERT_EQ(1u, sends.size()) << c.Stderr();
    EXPECT_EQ(1, sends[0].level);
    EXPECT_EQ(c.pid(), sends[0].pid);
    EXPECT_NE(std::string::npos, sends[0].text.find(std::to_string(kNode))) << sends[0].text;
}

}  // namespace

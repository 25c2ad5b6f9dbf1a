// Round trip of a 64-byte message to an echoing child process, through the
// messaging library and through the transport it is built on, used bare:
// the difference is what the library adds to every exchange.

#include "QelMsg_Client.h"
#include "kt48host.h"

#include <benchmark/benchmark.h>

#include <pthread.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <string>

namespace {

constexpr unsigned long kSize = 64;
constexpr unsigned short kParentNode = 1;
constexpr unsigned short kEchoNode = 2;

// Forks a child that runs echo and ends with it. The child also dies with
// the benchmark process, however that ends. parentEnd is the parent's side
// of the channel: the child must not hold it, or the parent's close could
// never tell the child to stop.
pid_t StartChild(int (*echo)(int), int arg, int parentEnd) {
    pid_t parent = getpid();
    pid_t pid = fork();
    if (pid == 0) {
        prctl(PR_SET_PDEATHSIG, SIGKILL);
        if (getppid() != parent) _exit(0);
        close(parentEnd);
        _exit(echo(arg));
    }
    return pid;
}

int Reap(pid_t pid) {
    int st = 0;
    while (waitpid(pid, &st, 0) < 0 && errno == EINTR) {
    }
    return WIFEXITED(st) ? WEXITSTATUS(st) : 128 + WTERMSIG(st);
}

// The child's side of the library round trip; a one-byte message ends it.
int LibraryEcho(int readyFd) {
    if (QelMsg_RegisterNode_kt48(kEchoNode, static_cast<int>(getpid()), pthread_self()) != QELMSG_OK) return 1;
    char c = 1;
    if (write(readyFd, &c, 1) != 1) return 2;
    close(readyFd);
    unsigned char buf[kSize];
    for (;;) {
        unsigned int a = 0, b = 0;
        if (QelMsg_ReceiveMessage(kEchoNode, &a, &b, buf, sizeof buf) != QELMSG_OK) return 3;
        if (a == 1) return 0;
        if (QelMsg_SendMessage_kt48(kEchoNode, kParentNode, 0, buf, a) != QELMSG_OK) return 4;
    }
}

void BM_RoundTripQelMsg(benchmark::State &state) {
    // A session of its own keeps the benchmark off a system running here.
    std::string session = "bench" + std::to_string(getpid());
    setenv(KT48HOST_SESSION_VARIABLE, session.c_str(), 1);
    if (QelMsg_RegisterNode_kt48(kParentNode, static_cast<int>(getpid()), pthread_self()) != QELMSG_OK) {
        state.SkipWithError("cannot register the node");
        return;
    }
    int ready[2];
    if (pipe(ready) != 0) {
        state.SkipWithError("pipe");
        return;
    }
    pid_t child = StartChild(LibraryEcho, ready[1], ready[0]);
    close(ready[1]);
    char c;
    bool started = child > 0 && read(ready[0], &c, 1) == 1;
    close(ready[0]);

    unsigned char out[kSize], in[kSize];
    std::memset(out, 0x5A, sizeof out);
    if (!started) state.SkipWithError("the echo child did not start");
    for (auto _ : state) {
        unsigned int a = 0, b = 0;
        if (QelMsg_SendMessage_kt48(kParentNode, kEchoNode, 0, out, kSize) != QELMSG_OK ||
            QelMsg_ReceiveMessage(kParentNode, &a, &b, in, sizeof in) != QELMSG_OK || a != kSize) {
            state.SkipWithError("round trip failed");
            break;
        }
    }
    state.SetItemsProcessed(state.iterations());

    if (child > 0) {
        if (QelMsg_SendMessage_kt48(kParentNode, kEchoNode, 0, out, 1) != QELMSG_OK) kill(child, SIGKILL);
        Reap(child);
    }
    QelMsg_UnregisterNode_kt48(kParentNode);
    unsetenv(KT48HOST_SESSION_VARIABLE);
}
BENCHMARK(BM_RoundTripQelMsg)->UseRealTime();

// The child's side of the bare round trip; the parent's close ends it.
int RawEcho(int fd) {
    unsigned char buf[kSize];
    for (;;) {
        ssize_t n = recv(fd, buf, sizeof buf, 0);
        if (n <= 0) return n == 0 ? 0 : 1;
        if (send(fd, buf, static_cast<size_t>(n), MSG_NOSIGNAL) != n) return 2;
    }
}

void BM_RoundTripSeqpacketSocketpair(benchmark::State &state) {
    int sv[2];
    if (socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, sv) != 0) {
        state.SkipWithError("socketpair");
        return;
    }
    pid_t child = StartChild(RawEcho, sv[1], sv[0]);
    close(sv[1]);
    if (child < 0) state.SkipWithError("fork");

    unsigned char out[kSize], in[kSize];
    std::memset(out, 0x5A, sizeof out);
    for (auto _ : state) {
        if (send(sv[0], out, kSize, MSG_NOSIGNAL) != static_cast<ssize_t>(kSize) ||
            recv(sv[0], in, sizeof in, 0) != static_cast<ssize_t>(kSize)) {
            state.SkipWithError("round trip failed");
            break;
        }
    }
    state.SetItemsProcessed(state.iterations());

    close(sv[0]);
    if (child > 0) Reap(child);
}
BENCHMARK(BM_RoundTripSeqpacketSocketpair)->UseRealTime();

}  // namespace

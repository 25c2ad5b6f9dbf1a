// Platform messaging library on the host.
//
// Transport: a node is a listening AF_UNIX SOCK_SEQPACKET socket in the
// abstract name space, named after the session and the pno. Each sending
// process keeps one connection per destination node, so a message is one
// send() into the kernel and one recv() out of it, its boundaries kept.
// Unlike POSIX message queues (10 messages a queue for an ordinary user)
// and datagram sockets (10 datagrams a receiver), a connection queues as
// much as its socket buffer holds. Abstract names vanish with their
// process, so a crashed receiver leaves nothing behind.

#include "QelMsg_Client.h"

#include "NS_Logger.h"
#include "kt48host.h"

#include <fcntl.h>
#include <pthread.h>
#include <sys/epoll.h>
#include <sys/eventfd.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <cstddef>
#include <cstdio>
#include <cstring>

#define QELMSG_API extern "C" __attribute__((visibility("default")))

namespace {

constexpr int kMaxNodes = 64;    // nodes registered by one process
constexpr int kPnoCount = 65536;
constexpr int kBacklog = 1024;
constexpr int kMaxConnections = 1024;  // sending processes of one node

struct Node {
    pthread_mutex_t rxLock;  // one receiver at a time owns the epoll set
    bool registered;
    unsigned short pno;
    unsigned long tid;
    int listenFd;
    int epollFd;
    int wakeFd;  // written by unregister to release a blocked receiver
    int connections;  // accepted connections, under rxLock
    int connection[kMaxConnections];
};

struct Registry {
    pthread_mutex_t lock = PTHREAD_MUTEX_INITIALIZER;  // registration and unregistration
    Node nodes[kMaxNodes];
    short byPno[kPnoCount];  // index + 1 of this process's node of a pno, 0 for none
};

struct Connections {
    // Senders hold it shared while they use a cached connection; replacing
    // a connection takes it exclusively, so no descriptor is closed under
    // a sender.
    pthread_rwlock_t lock = PTHREAD_RWLOCK_INITIALIZER;
    pthread_mutex_t connectLock = PTHREAD_MUTEX_INITIALIZER;
    int fd[kPnoCount];  // descriptor + 1 of the connection to a node, 0 for none
};

Registry g_reg;
Connections g_conn;
int g_sendLog = 0;  // transmission log of sends
int g_recvLog = 0;  // message-channel log of receives
pthread_once_t g_once = PTHREAD_ONCE_INIT;

void resetNode(Node &n) {
    pthread_mutex_init(&n.rxLock, nullptr);
    n.registered = false;
    n.pno = 0;
    n.tid = 0;
    n.listenFd = n.epollFd = n.wakeFd = -1;
    n.connections = 0;
}

void closeConnections(Node &n) {
    for (int i = 0; i < n.connections; ++i) close(n.connection[i]);
    n.connections = 0;
}

// Caller holds rxLock.
void forgetConnection(Node *n, int fd) {
    epoll_ctl(n->epollFd, EPOLL_CTL_DEL, fd, nullptr);
    close(fd);
    for (int i = 0; i < n->connections; ++i) {
        if (n->connection[i] == fd) {
            n->connection[i] = n->connection[--n->connections];
            break;
        }
    }
}

// A forked child is not the receiver of its parent's nodes and owns no
// lock that a parent's thread held: it starts with empty tables.
void afterForkChild() {
    pthread_mutex_init(&g_reg.lock, nullptr);
    for (Node &n : g_reg.nodes) {
        if (n.listenFd >= 0) close(n.listenFd);
        if (n.epollFd >= 0) close(n.epollFd);
        if (n.wakeFd >= 0) close(n.wakeFd);
        closeConnections(n);
        resetNode(n);
    }
    std::memset(g_reg.byPno, 0, sizeof g_reg.byPno);
    pthread_rwlock_init(&g_conn.lock, nullptr);
    pthread_mutex_init(&g_conn.connectLock, nullptr);
    for (int &fd : g_conn.fd) {
        if (fd > 0) close(fd - 1);
        fd = 0;
    }
}

void initOnce() {
    for (Node &n : g_reg.nodes) resetNode(n);
    pthread_atfork(nullptr, nullptr, afterForkChild);
}

void ensureInit() { pthread_once(&g_once, initOnce); }

bool nodeAddress(unsigned short pno, sockaddr_un *addr, socklen_t *len) {
    char target[32];
    std::snprintf(target, sizeof target, "QelMsg.%u", static_cast<unsigned>(pno));
    std::memset(addr, 0, sizeof *addr);
    addr->sun_family = AF_UNIX;
    // Abstract name: a leading NUL, then the name without terminator.
    if (KT48Host_SystemName(target, addr->sun_path + 1, sizeof addr->sun_path - 1) != 0) return false;
    *len = static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + 1 + std::strlen(addr->sun_path + 1));
    return true;
}

int parseSwitch(const char *text) {
    if (text == nullptr) return 0;
    return std::strcmp(text, "on") == 0 || std::strcmp(text, "1") == 0 || std::strcmp(text, "all") == 0;
}

Node *ownNode(unsigned long node) {
    if (node == 0 || node >= static_cast<unsigned long>(kPnoCount)) return nullptr;
    short idx = __atomic_load_n(&g_reg.byPno[node], __ATOMIC_ACQUIRE);
    if (idx <= 0) return nullptr;
    Node *n = &g_reg.nodes[idx - 1];
    return __atomic_load_n(&n->registered, __ATOMIC_ACQUIRE) ? n : nullptr;
}

// Connects to a node; caller holds connectLock. The descriptor, or -1.
int connectNode(unsigned short pno) {
    sockaddr_un addr;
    socklen_t len;
    if (!nodeAddress(pno, &addr, &len)) return -1;
    int fd = socket(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
    if (fd < 0) return -1;
    if (connect(fd, reinterpret_cast<sockaddr *>(&addr), len) != 0) {
        int saved = errno;
        close(fd);
        errno = saved;
        return -1;
    }
    return fd;
}

// Drops the cached connection fd of node `to` if it is still the cached one.
void dropConnection(unsigned long to, int fd) {
    pthread_rwlock_wrlock(&g_conn.lock);
    if (g_conn.fd[to] == fd + 1) {
        g_conn.fd[to] = 0;
        close(fd);
    }
    pthread_rwlock_unlock(&g_conn.lock);
}

int sendOnce(unsigned long to, const void *message, unsigned long size, bool *stale, int *usedFd) {
    *stale = false;
    pthread_rwlock_rdlock(&g_conn.lock);
    int fd = g_conn.fd[to] - 1;
    if (fd < 0) {
        pthread_rwlock_unlock(&g_conn.lock);
        pthread_mutex_lock(&g_conn.connectLock);
        pthread_rwlock_rdlock(&g_conn.lock);
        fd = g_conn.fd[to] - 1;
        if (fd < 0) {
            pthread_rwlock_unlock(&g_conn.lock);
            int nfd = connectNode(static_cast<unsigned short>(to));
            int err = errno;
            if (nfd < 0) {
                pthread_mutex_unlock(&g_conn.connectLock);
                if (err == EAGAIN) return QELMSG_E_FULL;  // the node's backlog is full
                return (err == ECONNREFUSED || err == ENOENT) ? QELMSG_E_NONODE : QELMSG_E_TRANSPORT;
            }
            pthread_rwlock_wrlock(&g_conn.lock);
            g_conn.fd[to] = nfd + 1;
            pthread_rwlock_unlock(&g_conn.lock);
            pthread_rwlock_rdlock(&g_conn.lock);
            fd = g_conn.fd[to] - 1;
        }
        pthread_mutex_unlock(&g_conn.connectLock);
        if (fd < 0) {
            pthread_rwlock_unlock(&g_conn.lock);
            return QELMSG_E_NONODE;
        }
    }
    ssize_t n = send(fd, message, size, MSG_DONTWAIT | MSG_NOSIGNAL);
    int err = errno;
    pthread_rwlock_unlock(&g_conn.lock);
    *usedFd = fd;
    if (n == static_cast<ssize_t>(size)) return QELMSG_OK;
    if (n >= 0) return QELMSG_E_TRANSPORT;
    switch (err) {
        case EAGAIN: return QELMSG_E_FULL;
        case EINTR: return QELMSG_E_INTR;
        case EMSGSIZE: return QELMSG_E_PARAM;
        case EPIPE:
        case ECONNRESET:
        case ENOTCONN:
        case ECONNREFUSED:
            *stale = true;
            return QELMSG_E_NONODE;
        default:
            errno = err;
            return QELMSG_E_TRANSPORT;
    }
}

void acceptAll(Node *n) {
    for (;;) {
        int fd = accept4(n->listenFd, nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK);
        if (fd < 0) return;
        if (n->connections == kMaxConnections) {
            close(fd);
            continue;
        }
        ucred cred{};
        socklen_t len = sizeof cred;
        if (getsockopt(fd, SOL_SOCKET, SO_PEERCRED, &cred, &len) != 0) cred.pid = 0;
        epoll_event ev{};
        ev.events = EPOLLIN | EPOLLRDHUP;
        ev.data.u64 = (static_cast<uint64_t>(static_cast<uint32_t>(cred.pid)) << 32) |
                      static_cast<uint32_t>(fd);
        if (epoll_ctl(n->epollFd, EPOLL_CTL_ADD, fd, &ev) != 0) {
            close(fd);
            continue;
        }
        n->connection[n->connections++] = fd;
    }
}

int receive(unsigned long node, unsigned int *a, unsigned int *b, void *buffer, unsigned long size,
            bool blocking) {
    if (buffer == nullptr || size == 0 || node == 0 || node >= static_cast<unsigned long>(kPnoCount))
        return QELMSG_E_PARAM;
    ensureInit();
    Node *n = ownNode(node);
    if (n == nullptr) return QELMSG_E_NOTOWNER;
    if (blocking) {
        pthread_mutex_lock(&n->rxLock);
    } else if (pthread_mutex_trylock(&n->rxLock) != 0) {
        return QELMSG_E_EMPTY;  // another thread is receiving for this node
    }
    int status = QELMSG_E_EMPTY;
    for (;;) {
        // The node may have been withdrawn (and its slot reused) before we got the lock.
        if (!__atomic_load_n(&n->registered, __ATOMIC_ACQUIRE) || n->pno != node) {
            status = QELMSG_RCV_CLOSED;
            break;
        }
        epoll_event evs[8];
        int count = epoll_wait(n->epollFd, evs, 8, blocking ? -1 : 0);
        if (count < 0) {
            status = errno == EINTR ? QELMSG_E_INTR : QELMSG_E_TRANSPORT;
            break;
        }
        if (count == 0) {
            status = QELMSG_E_EMPTY;
            break;
        }
        bool done = false;
        for (int i = 0; i < count && !done; ++i) {
            int fd = static_cast<int>(evs[i].data.u64 & 0xFFFFFFFFu);
            if (fd == n->wakeFd) {
                status = QELMSG_RCV_CLOSED;
                done = true;
            } else if (fd == n->listenFd) {
                acceptAll(n);
            } else {
                ssize_t got = recv(fd, buffer, size, MSG_DONTWAIT | MSG_TRUNC);
                if (got > 0) {
                    if (a) *a = static_cast<unsigned int>(got);
                    if (b) *b = static_cast<unsigned int>(evs[i].data.u64 >> 32);
                    status = static_cast<unsigned long>(got) > size ? QELMSG_E_TOOBIG : QELMSG_OK;
                    done = true;
                } else if (got == 0 || (errno != EAGAIN && errno != EINTR)) {
                    forgetConnection(n, fd);  // the sender went away
                }
            }
        }
        if (done) break;
    }
    pthread_mutex_unlock(&n->rxLock);
    if (g_recvLog && status == QELMSG_OK)
        QelLog(1, __LINE__, "QelMsg_ReceiveMessage", "QelMsg receive node %lu size %u from pid %u\n",
               node, a ? *a : 0u, b ? *b : 0u);
    return status;
}

}  // namespace

QELMSG_API int QelMsg_System_Init(void) {
    ensureInit();
    return 0;
}

QELMSG_API int QelMsg_Process_Init(void) {
    ensureInit();
    return 0;
}

QELMSG_API int QelMsg_RegisterNode_kt48(unsigned short pno, int pid, unsigned long tid) {
    if (pno == 0 || pid != static_cast<int>(getpid())) return QELMSG_E_PARAM;
    ensureInit();
    pthread_mutex_lock(&g_reg.lock);
    int status = QELMSG_OK;
    short idx = g_reg.byPno[pno];
    if (idx > 0) {
        g_reg.nodes[idx - 1].tid = tid;  // the process names another thread for its node
        pthread_mutex_unlock(&g_reg.lock);
        return status;
    }
    Node *n = nullptr;
    int slot = -1;
    for (int i = 0; i < kMaxNodes; ++i) {
        if (!g_reg.nodes[i].registered && g_reg.nodes[i].listenFd < 0) {
            n = &g_reg.nodes[i];
            slot = i;
            break;
        }
    }
    sockaddr_un addr;
    socklen_t len;
    if (n == nullptr || !nodeAddress(pno, &addr, &len)) {
        pthread_mutex_unlock(&g_reg.lock);
        return n == nullptr ? QELMSG_E_TRANSPORT : QELMSG_E_PARAM;
    }
    n->listenFd = socket(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
    n->epollFd = epoll_create1(EPOLL_CLOEXEC);
    n->wakeFd = eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
    if (n->listenFd < 0 || n->epollFd < 0 || n->wakeFd < 0) {
        status = QELMSG_E_TRANSPORT;
    } else if (bind(n->listenFd, reinterpret_cast<sockaddr *>(&addr), len) != 0) {
        status = errno == EADDRINUSE ? QELMSG_E_REGISTERED : QELMSG_E_TRANSPORT;
    } else if (listen(n->listenFd, kBacklog) != 0) {
        status = QELMSG_E_TRANSPORT;
    } else {
        epoll_event ev{};
        ev.events = EPOLLIN;
        ev.data.u64 = static_cast<uint32_t>(n->listenFd);
        epoll_ctl(n->epollFd, EPOLL_CTL_ADD, n->listenFd, &ev);
        ev.data.u64 = static_cast<uint32_t>(n->wakeFd);
        epoll_ctl(n->epollFd, EPOLL_CTL_ADD, n->wakeFd, &ev);
    }
    if (status != QELMSG_OK) {
        if (n->listenFd >= 0) close(n->listenFd);
        if (n->epollFd >= 0) close(n->epollFd);
        if (n->wakeFd >= 0) close(n->wakeFd);
        n->listenFd = n->epollFd = n->wakeFd = -1;
    } else {
        n->pno = pno;
        n->tid = tid;
        __atomic_store_n(&n->registered, true, __ATOMIC_RELEASE);
        __atomic_store_n(&g_reg.byPno[pno], static_cast<short>(slot + 1), __ATOMIC_RELEASE);
    }
    pthread_mutex_unlock(&g_reg.lock);
    return status;
}

QELMSG_API int QelMsg_UnregisterNode_kt48(unsigned short pno) {
    ensureInit();
    pthread_mutex_lock(&g_reg.lock);
    short idx = pno ? g_reg.byPno[pno] : 0;
    if (idx <= 0) {
        pthread_mutex_unlock(&g_reg.lock);
        return QELMSG_E_NONODE;
    }
    Node *n = &g_reg.nodes[idx - 1];
    __atomic_store_n(&n->registered, false, __ATOMIC_RELEASE);
    __atomic_store_n(&g_reg.byPno[pno], static_cast<short>(0), __ATOMIC_RELEASE);
    uint64_t one = 1;
    ssize_t w = write(n->wakeFd, &one, sizeof one);
    (void)w;
    // Wait for the receiver that the wake-up releases, then close the node;
    // its connections close with it and their senders see the node gone.
    pthread_mutex_lock(&n->rxLock);
    closeConnections(*n);
    close(n->listenFd);
    close(n->epollFd);
    close(n->wakeFd);
    n->listenFd = n->epollFd = n->wakeFd = -1;
    n->pno = 0;
    pthread_mutex_unlock(&n->rxLock);
    pthread_mutex_unlock(&g_reg.lock);
    return QELMSG_OK;
}

QELMSG_API int QelMsg_SendMessage_kt48(unsigned short sender, unsigned long to, unsigned short code,
                                       const void *message, unsigned long size) {
    if (message == nullptr || size == 0 || size > QELMSG_MAX_MESSAGE || to == 0 ||
        to >= static_cast<unsigned long>(kPnoCount))
        return QELMSG_E_PARAM;
    ensureInit();
    bool stale = false;
    int fd = -1;
    int status = sendOnce(to, message, size, &stale, &fd);
    if (stale) {
        // The node was withdrawn or registered anew since we connected:
        // connect once more to whoever holds the pno now.
        dropConnection(to, fd);
        status = sendOnce(to, message, size, &stale, &fd);
        if (stale) dropConnection(to, fd);
    }
    if (g_sendLog)
        QelLog(1, __LINE__, "QelMsg_SendMessage_kt48",
               "QelMsg send from %u to %lu code 0x%04x size %lu status %d\n",
               static_cast<unsigned>(sender), to, static_cast<unsigned>(code), size, status);
    return status;
}

QELMSG_API int QelMsg_ReceiveMessage(unsigned long node, unsigned int *a, unsigned int *b,
                                     void *buffer, unsigned long size) {
    return receive(node, a, b, buffer, size, true);
}

QELMSG_API int QelMsg_ReceiveMessageNotBlocked(unsigned long node, unsigned int *a, unsigned int *b,
                                               void *buffer, unsigned long size) {
    return receive(node, a, b, buffer, size, false);
}

QELMSG_API int McDetermineTransmitLogging(const char *text) {
    __atomic_store_n(&g_recvLog, parseSwitch(text), __ATOMIC_RELAXED);
    return 0;
}

namespace qelmsg {
__attribute__((visibility("default"))) int QelMsg_DetermineTransmitLogging(char const *text) {
    __atomic_store_n(&g_sendLog, parseSwitch(text), __ATOMIC_RELAXED);
    return 0;
}
}  // namespace qelmsg

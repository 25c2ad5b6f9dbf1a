// The platform logger on the host: the log sink QelLog, the NS log with its
// category mask and output method, and the performance log.
//
// Records go to one destination chosen by the method text: standard error
// (the default), a file, syslog, or nowhere. The method inherited through
// "ORVANsLogMethod" is applied on first use, so records written before the
// process initialisation follow it too.

#include "NS_Logger.h"

#include <fcntl.h>
#include <pthread.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#define NSLOG_API extern "C" __attribute__((visibility("default")))

// The logger's parameter block, defined by the library that uses the
// logger; its control word mirrors the category mask. Weak, so that the
// logger also works in a process without that library.
extern "C" unsigned char g_VekLogParams[] __attribute__((weak));

__attribute__((visibility("default"))) unsigned int g_VekLogPParams[4] = {0, 0, 0, 0};

namespace {

constexpr size_t kControlWordOffset = 12052;
constexpr size_t kPathMax = 4096;

struct LoggerState {
    pthread_mutex_t lock = PTHREAD_MUTEX_INITIALIZER;
    int method = NSLOG_METHOD_STDERR;
    int fd = -1;  // the file of the file method
    char pendingPath[kPathMax] = {};
    char processName[64] = {};
    unsigned int mask[NSLOG_MASK_WORDS] = {};
    unsigned int control = 0;
};

LoggerState g_state;
pthread_once_t g_once = PTHREAD_ONCE_INIT;

int determine(const char *text, char *path) {
    if (text == nullptr) return NSLOG_METHOD_STDERR;
    if (std::strcmp(text, "none") == 0) return NSLOG_METHOD_NONE;
    if (std::strcmp(text, "syslog") == 0) return NSLOG_METHOD_SYSLOG;
    if (std::strncmp(text, "file:", 5) == 0 && text[5] != '\0') {
        std::snprintf(path, kPathMax, "%s", text + 5);
        return NSLOG_METHOD_FILE;
    }
    return NSLOG_METHOD_STDERR;
}

// Caller holds g_state.lock.
void applyMethodLocked(int method) {
    if (g_state.fd >= 0) {
        close(g_state.fd);
        g_state.fd = -1;
    }
    if (method == NSLOG_METHOD_FILE) {
        g_state.fd = open(g_state.pendingPath, O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0644);
        if (g_state.fd < 0) method = NSLOG_METHOD_STDERR;  // a log that cannot open still reports
    }
    if (method == NSLOG_METHOD_SYSLOG)
        openlog(g_state.processName[0] ? g_state.processName : nullptr, LOG_PID, LOG_USER);
    g_state.method = method;
}

void initOnce() {
    const char *name = program_invocation_short_name;
    std::snprintf(g_state.processName, sizeof g_state.processName, "%s", name ? name : "");
    const char *inherited = std::getenv("ORVANsLogMethod");
    if (inherited != nullptr) {
        pthread_mutex_lock(&g_state.lock);
        applyMethodLocked(determine(inherited, g_state.pendingPath));
        pthread_mutex_unlock(&g_state.lock);
    }
}

void ensureInit() { pthread_once(&g_once, initOnce); }

bool writeAll(int fd, const char *data, size_t len) {
    while (len > 0) {
        ssize_t n = write(fd, data, len);
        if (n < 0) {
            if (errno == EINTR) continue;
            return false;
        }
        data += n;
        len -= static_cast<size_t>(n);
    }
    return true;
}

// Writes one record: the header line, the text, a newline. The record is
// assembled first so that one write puts it out whole.
void emit(int priority, const char *header, const char *text, size_t textLen) {
    ensureInit();
    int saved = errno;  // logging never disturbs the caller's last error
    char small[2048];
    size_t headerLen = std::strlen(header);
    size_t total = headerLen + textLen + 1;
    char *buf = total <= sizeof small ? small : static_cast<char *>(std::malloc(total));
    if (buf != nullptr) {
        std::memcpy(buf, header, headerLen);
        std::memcpy(buf + headerLen, text, textLen);
        buf[total - 1] = '\n';
        pthread_mutex_lock(&g_state.lock);
        switch (g_state.method) {
            case NSLOG_METHOD_NONE:
                break;
            case NSLOG_METHOD_FILE:
                writeAll(g_state.fd, buf, total);
                break;
            case NSLOG_METHOD_SYSLOG:
                syslog(priority, "%.*s", static_cast<int>(total - 1), buf);
                break;
            default:
                writeAll(STDERR_FILENO, buf, total);
                break;
        }
        pthread_mutex_unlock(&g_state.lock);
        if (buf != small) std::free(buf);
    }
    errno = saved;
}

// Formats into a buffer of the caller's, or a heap buffer for long text.
char *formatText(char *small, size_t smallSize, size_t *len, const char *format, va_list ap) {
    va_list copy;
    va_copy(copy, ap);
    int n = std::vsnprintf(small, smallSize, format ? format : "", copy);
    va_end(copy);
    if (n < 0) {
        small[0] = '\0';
        *len = 0;
        return small;
    }
    *len = static_cast<size_t>(n);
    if (static_cast<size_t>(n) < smallSize) return small;
    char *big = static_cast<char *>(std::malloc(static_cast<size_t>(n) + 1));
    if (big == nullptr) {
        *len = smallSize - 1;
        return small;
    }
    std::vsnprintf(big, static_cast<size_t>(n) + 1, format, ap);
    return big;
}

const char *orDash(const char *s) { return (s && *s) ? s : "-"; }

}  // namespace

NSLOG_API int QelLog(int level, int line, const char *function, const char *format, ...) {
    int saved = errno;
    char small[1024];
    size_t len = 0;
    va_list ap;
    va_start(ap, format);
    char *text = formatText(small, sizeof small, &len, format, ap);
    va_end(ap);
    ensureInit();
    char header[256];
    std::snprintf(header, sizeof header, "#QelLog level=%d func=%s line=%d proc=%s pid=%d len=%zu\n",
                  level, orDash(function), line, orDash(g_state.processName),
                  static_cast<int>(getpid()), len);
    emit(level == 1 ? LOG_INFO : LOG_ERR, header, text, len);
    if (text != small) std::free(text);
    errno = saved;
    return static_cast<int>(len);
}

NSLOG_API void NsLogSetProcessName(const char *name) {
    if (name == nullptr) return;
    ensureInit();
    pthread_mutex_lock(&g_state.lock);
    std::snprintf(g_state.processName, sizeof g_state.processName, "%s", name);
    pthread_mutex_unlock(&g_state.lock);
}

NSLOG_API int NsLogDetermineLogMethod(const char *text) {
    ensureInit();
    pthread_mutex_lock(&g_state.lock);
    int method = determine(text, g_state.pendingPath);
    pthread_mutex_unlock(&g_state.lock);
    return method;
}

NSLOG_API void NsLogSetLogMethod(int method) {
    if (method < NSLOG_METHOD_NONE || method > NSLOG_METHOD_SYSLOG) method = NSLOG_METHOD_STDERR;
    ensureInit();
    pthread_mutex_lock(&g_state.lock);
    applyMethodLocked(method);
    pthread_mutex_unlock(&g_state.lock);
}

NSLOG_API void NsLogSetControlMask(const unsigned int *mask) {
    if (mask == nullptr) return;
    unsigned int control = 0;
    pthread_mutex_lock(&g_state.lock);
    for (int i = 0; i < NSLOG_MASK_WORDS; ++i) {
        g_state.mask[i] = mask[i];
        control |= mask[i];
    }
    __atomic_store_n(&g_state.control, control, __ATOMIC_RELAXED);
    pthread_mutex_unlock(&g_state.lock);
    if (g_VekLogParams != nullptr) {
        unsigned int *word = reinterpret_cast<unsigned int *>(g_VekLogParams + kControlWordOffset);
        __atomic_store_n(word, control, __ATOMIC_RELAXED);
    }
}

NSLOG_API void NsLogGetControlMask(unsigned int *mask) {
    if (mask == nullptr) return;
    pthread_mutex_lock(&g_state.lock);
    for (int i = 0; i < NSLOG_MASK_WORDS; ++i) mask[i] = g_state.mask[i];
    pthread_mutex_unlock(&g_state.lock);
}

NSLOG_API void NsLog(unsigned short line, int category, const char *function, const char *text) {
    if (category < 0 || category > 31) return;
    if ((__atomic_load_n(&g_state.control, __ATOMIC_RELAXED) & (1u << category)) == 0) return;
    if (text == nullptr) text = "";
    ensureInit();
    char header[256];
    size_t len = std::strlen(text);
    std::snprintf(header, sizeof header, "#NsLog cat=%d func=%s line=%u proc=%s pid=%d len=%zu\n",
                  category, orDash(function), static_cast<unsigned>(line),
                  orDash(g_state.processName), static_cast<int>(getpid()), len);
    emit(category == 29 ? LOG_INFO : LOG_ERR, header, text, len);
}

NSLOG_API void NSLogEnablePLog(int enable) {
    __atomic_store_n(&g_VekLogPParams[0], enable ? 1u : 0u, __ATOMIC_RELAXED);
}

NSLOG_API void NSLogPrintPerformanceLog(unsigned short id, unsigned int value, const char *text) {
    if (__atomic_load_n(&g_VekLogPParams[0], __ATOMIC_RELAXED) == 0) return;
    if (text == nullptr) text = "";
    ensureInit();
    char header[256];
    size_t len = std::strlen(text);
    std::snprintf(header, sizeof header, "#PLog id=%u value=%u proc=%s pid=%d len=%zu\n",
                  static_cast<unsigned>(id), value, orDash(g_state.processName),
                  static_cast<int>(getpid()), len);
    emit(LOG_INFO, header, text, len);
}

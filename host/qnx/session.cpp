// System instance naming. The one place where a session word turns the
// target's system-wide names into names of this session.

#include "kt48host.h"

#include <climits>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>

namespace {

bool validWord(const char *word) {
    size_t n = std::strlen(word);
    if (n == 0 || n > KT48HOST_SESSION_MAX) return false;
    for (size_t i = 0; i < n; ++i) {
        char c = word[i];
        bool ok = (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') ||
                  c == '_' || c == '-';
        if (!ok) return false;
    }
    return true;
}

uint64_t fnv1a64(const char *s) {
    uint64_t h = 14695981039346656037ull;
    for (; *s; ++s) {
        h ^= static_cast<unsigned char>(*s);
        h *= 1099511628211ull;
    }
    return h;
}

int copyOut(char *out, size_t outSize, const char *text) {
    size_t n = std::strlen(text);
    if (n + 1 > outSize) return -1;
    std::memcpy(out, text, n + 1);
    return 0;
}

}  // namespace

extern "C" __attribute__((visibility("default"))) const char *KT48Host_Session(int *valid) {
    const char *word = std::getenv(KT48HOST_SESSION_VARIABLE);
    if (valid) *valid = 1;
    if (word == nullptr || *word == '\0') return nullptr;
    if (valid) *valid = validWord(word) ? 1 : 0;
    return word;
}

extern "C" __attribute__((visibility("default"))) int KT48Host_SystemName(const char *targetName,
                                                                          char *out,
                                                                          size_t outSize) {
    if (targetName == nullptr || out == nullptr || outSize == 0) return -1;
    int valid = 1;
    const char *session = KT48Host_Session(&valid);
    if (session == nullptr) return copyOut(out, outSize, targetName);
    if (!valid) return -1;

    static const char kTmp[] = "/tmp/";
    const size_t tmpLen = sizeof kTmp - 1;
    int n;
    if (std::strncmp(targetName, kTmp, tmpLen) == 0 && targetName[tmpLen] != '\0') {
        // "/tmp/SHM/rest" -> "/tmp/SHM.<s>/rest"
        const char *component = targetName + tmpLen;
        const char *rest = std::strchr(component, '/');
        size_t compLen = rest ? static_cast<size_t>(rest - component) : std::strlen(component);
        n = std::snprintf(out, outSize, "%s%.*s.%s%s", kTmp, static_cast<int>(compLen), component,
                          session, rest ? rest : "");
    } else if (targetName[0] == '/') {
        n = std::snprintf(out, outSize, "/%s.%s", session, targetName + 1);
        if (n >= 0 && static_cast<size_t>(n) > NAME_MAX && outSize > NAME_MAX) {
            // POSIX names are limited to NAME_MAX: keep a readable prefix and
            // make the end unique with a hash of the whole target name.
            char hash[18];
            std::snprintf(hash, sizeof hash, "~%016llx",
                          static_cast<unsigned long long>(fnv1a64(targetName)));
            size_t keep = NAME_MAX - (sizeof hash - 1);
            out[keep] = '\0';
            std::strcat(out, hash);
            return 0;
        }
    } else {
        n = std::snprintf(out, outSize, "%s.%s", session, targetName);
    }
    if (n < 0 || static_cast<size_t>(n) >= outSize) return -1;
    return 0;
}

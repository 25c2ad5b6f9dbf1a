// A fresh process that runs library calls for the tests: what it finds
// comes only from its environment, never from the test's own memory.
// It answers on fd 4 when that is open, else on standard output.

#include "kt48api.h"

#include <NS_Logger.h>

#include <fcntl.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>

namespace {

void answer(const std::string &line) {
    int fd = fcntl(4, F_GETFD) >= 0 ? 4 : STDOUT_FILENO;
    std::string out = line + "\n";
    ssize_t n = write(fd, out.data(), out.size());
    (void)n;
}

std::string env(const char *name) {
    const char *v = std::getenv(name);
    return v ? v : "(unset)";
}

unsigned int controlWord() {
    unsigned int w;
    std::memcpy(&w, g_VekLogParams + 12052, sizeof w);
    return w;
}

}  // namespace

int main(int argc, char **argv) {
    if (argc < 2) return 2;
    std::string cmd = argv[1];
    char buf[256];
    if (cmd == "init") {
        QelLog(4, 1, "probe", "before init\n");
        int r = KT48API_ProcessInit(nullptr);
        std::snprintf(buf, sizeof buf, "result=%d plog=%u control=%08x", r, g_VekLogPParams[0],
                      controlWord());
        answer(buf);
        return 0;
    }
    if (cmd == "kinit" && argc == 3) {
        int r = KT48API_Init(static_cast<unsigned int>(std::strtoul(argv[2], nullptr, 0)));
        std::snprintf(buf, sizeof buf, "result=%d", r);
        answer(buf);
        return 0;
    }
    if (cmd == "args") {
        _sys_ProcessArguments(argc - 1, argv + 1);
        answer("method=" + env("ORVANsLogMethod") + " mask=" + env("ORVANsLogMask") +
               " plog=" + env("ORVAPLog") + " mc=" + env("ORVAMcLog") +
               " plogon=" + std::to_string(g_VekLogPParams[0]));
        return 0;
    }
    return 2;
}

// Example system: a start-up process clears the system and creates the
// system objects, then two application processes initialise and share a
// region. Runs in the session "demo" unless KT48_SESSION names another,
// and removes what it made at the end.

#include "kt48api.h"

#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>

namespace {

int writer(int done) {
    if (KT48API_ProcessInit(nullptr) != 0) return 1;
    HSHAREDMEMORY h = CreateSharedMemory("DEMO_REGION", 64);
    if (h == nullptr) return 2;
    std::snprintf(static_cast<char *>(GetSharedMemoryPtr(h)), 64, "hello from process %d", getpid());
    std::printf("B (%d): created DEMO_REGION and wrote into it\n", getpid());
    std::fflush(stdout);
    CloseSharedMemory(h);
    char c = 1;
    return write(done, &c, 1) == 1 ? 0 : 3;
}

int reader(int ready) {
    if (KT48API_ProcessInit(nullptr) != 0) return 1;
    char c;
    if (read(ready, &c, 1) != 1) return 2;
    HSHAREDMEMORY h = OpenSharedMemory("DEMO_REGION", 0);
    if (h == nullptr) return 3;
    std::printf("C (%d): opened DEMO_REGION (%u bytes) and read \"%s\"\n", getpid(),
                GetSharedMemorySize(h), static_cast<char *>(GetSharedMemoryPtr(h)));
    std::fflush(stdout);
    CloseSharedMemory(h);
    return 0;
}

int waitFor(pid_t pid) {
    int st = 0;
    waitpid(pid, &st, 0);
    return WIFEXITED(st) ? WEXITSTATUS(st) : 128 + WTERMSIG(st);
}

}  // namespace

int main(int argc, char **argv) {
    if (std::getenv("KT48_SESSION") == nullptr) setenv("KT48_SESSION", "demo", 1);
    _sys_ProcessArguments(argc, argv);
    std::printf("A (%d): start-up in session \"%s\"\n", getpid(), std::getenv("KT48_SESSION"));
    if (Exclude_SystemInit() != 0 || KT48API_ProcessInit(nullptr) != 0) {
        std::fprintf(stderr, "A: system start-up failed\n");
        return 1;
    }
    std::fflush(stdout);
    int pipefd[2];
    if (pipe(pipefd) != 0) return 1;
    pid_t b = fork();
    if (b == 0) _exit(writer(pipefd[1]));
    pid_t c = fork();
    if (c == 0) _exit(reader(pipefd[0]));
    close(pipefd[0]);
    close(pipefd[1]);
    int rb = waitFor(b), rc = waitFor(c);
    std::printf("A: B ended with %d, C ended with %d\n", rb, rc);
    DeleteAllSharedMemory();
    return rb == 0 && rc == 0 ? 0 : 1;
}

// Log controls and front ends. Each control stores its setting in the
// environment before applying it, so that processes started afterwards
// inherit it; the process initialisation applies the inherited ones.

#include "kt48api/log.h"

#include "../Common/_sysPlatform.h"

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>

namespace {

constexpr size_t kControlWordOffset = 12052;

constexpr int kCategoryLevel1 = 29;
constexpr int kCategoryLevel4 = 30;

const char kMethodVariable[] = "ORVANsLogMethod";
const char kMaskVariable[] = "ORVANsLogMask";
const char kPLogVariable[] = "ORVAPLog";
const char kMcLogVariable[] = "ORVAMcLog";

static_assert(kControlWordOffset % 4 == 0 && kControlWordOffset + 4 <= KT48_LOG_PARAMS_SIZE,
              "the control word is an aligned word of the block");

unsigned int controlWord() {
    return __atomic_load_n(reinterpret_cast<const unsigned int *>(g_VekLogParams + kControlWordOffset),
                           __ATOMIC_RELAXED);
}

// Splits a copy of the text: the caller's text may be read-only.
void applyMask(const char *text) {
    unsigned int mask[NSLOG_MASK_WORDS] = {};
    size_t len = std::strlen(text);
    char *copy = static_cast<char *>(std::malloc(len + 1));
    if (copy != nullptr) {
        std::memcpy(copy, text, len + 1);
        int word = 0;
        char *save = nullptr;
        for (char *piece = strtok_r(copy, ",", &save); piece != nullptr && word < NSLOG_MASK_WORDS;
             piece = strtok_r(nullptr, ",", &save)) {
            mask[word++] = static_cast<unsigned int>(std::strtoul(piece, nullptr, 16));
        }
        std::free(copy);
    }
    NsLogSetControlMask(mask);
}

// Formats into a buffer of the caller's, cut to its size; a null format or
// a failed conversion gives an empty text.
__attribute__((format(printf, 3, 0))) void formatInto(char *buffer, size_t size, const char *format,
                                                      va_list ap) {
    buffer[0] = '\0';
    if (format != nullptr && std::vsnprintf(buffer, size, format, ap) < 0) buffer[0] = '\0';
}

void applyMethod(const char *text) { NsLogSetLogMethod(NsLogDetermineLogMethod(text)); }

void applyTransmissionLog(const char *text) {
    qelmsg::QelMsg_DetermineTransmitLogging(text);
    McDetermineTransmitLogging(text);
}

}  // namespace

extern "C" void ORVA_SetLogMethod(const char *text) {
    if (text == nullptr) return;
    setenv(kMethodVariable, text, 1);
    applyMethod(text);
}

extern "C" void ORVA_SetLogControlMask(const char *text) {
    if (text == nullptr) return;
    setenv(kMaskVariable, text, 1);
    applyMask(text);
}

extern "C" void _sys_SetupNsLog(void) {
    if (program_invocation_short_name != nullptr) NsLogSetProcessName(program_invocation_short_name);
    if (const char *method = std::getenv(kMethodVariable)) applyMethod(method);
    if (const char *mask = std::getenv(kMaskVariable)) {
        char buffer[256];
        std::snprintf(buffer, sizeof buffer, "%.255s", mask);
        applyMask(buffer);
    }
}

extern "C" void ORVA_NsLog(int level, int line, const char *function, const char *format, ...) {
    int category;
    unsigned int bit;
    if (level == 1) {
        category = kCategoryLevel1;
        bit = KT48_LOG_CONTROL_LEVEL1;
    } else if (level == 4) {
        category = kCategoryLevel4;
        bit = KT48_LOG_CONTROL_LEVEL4;
    } else {
        return;
    }
    if ((controlWord() & bit) == 0) return;  // a disabled record costs one read
    char buffer[257];
    va_list ap;
    va_start(ap, format);
    formatInto(buffer, sizeof buffer, format, ap);
    va_end(ap);
    NsLog(static_cast<unsigned short>(line), category, function, buffer);
}

extern "C" int _sys_EnablePLog(void) {
    NSLogEnablePLog(1);
    return setenv(kPLogVariable, "Enabled", 1);
}

extern "C" void _sys_SetupPLog(void) {
    const char *value = std::getenv(kPLogVariable);
    if (value != nullptr && std::strcmp(value, "Enabled") == 0) NSLogEnablePLog(1);
}

extern "C" void ORVA_PLog(unsigned short id, unsigned int value, const char *format, ...) {
    if (__atomic_load_n(&g_VekLogPParams[0], __ATOMIC_RELAXED) == 0) return;
    char buffer[1024];
    va_list ap;
    va_start(ap, format);
    formatInto(buffer, sizeof buffer, format, ap);
    va_end(ap);
    NSLogPrintPerformanceLog(id, value, buffer);
}

extern "C" void ORVA_SetTransmissionLog(const char *text) {
    if (text == nullptr) return;
    setenv(kMcLogVariable, text, 1);
    applyTransmissionLog(text);
}

extern "C" void _sys_SetupMcLog(void) {
    if (const char *text = std::getenv(kMcLogVariable)) applyTransmissionLog(text);
}

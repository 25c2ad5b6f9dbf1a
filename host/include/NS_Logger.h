/* Platform logger: the log sink QelLog and the NS/performance logs.
 *
 * Every record is written as one header line followed by the text exactly
 * as formatted and a newline:
 *   #QelLog level=<l> func=<function> line=<n> proc=<name> pid=<pid> len=<bytes>
 *   #NsLog cat=<c> func=<function> line=<n> proc=<name> pid=<pid> len=<bytes>
 *   #PLog id=<id> value=<v> proc=<name> pid=<pid> len=<bytes>
 * <len> counts the text bytes that follow the header line. */
#ifndef NS_LOGGER_H
#define NS_LOGGER_H

#ifdef __cplusplus
extern "C" {
#endif

/* Method values of NsLogDetermineLogMethod. */
#define NSLOG_METHOD_NONE 0
#define NSLOG_METHOD_STDERR 1
#define NSLOG_METHOD_FILE 2
#define NSLOG_METHOD_SYSLOG 3

#define NSLOG_MASK_WORDS 16

/* The performance-log switch: word 0 is non-zero while the P log is on. */
extern unsigned int g_VekLogPParams[4];

int QelLog(int level, int line, const char *function, const char *format, ...)
    __attribute__((format(printf, 4, 5)));

void NsLogSetProcessName(const char *name);
/* "stderr", "file:<path>", "syslog" or "none"; anything else is stderr.
 * A file method remembers its path for the following NsLogSetLogMethod. */
int NsLogDetermineLogMethod(const char *text);
void NsLogSetLogMethod(int method);
/* The category mask: category c (0..31) is on when bit c is set in any of
 * the 16 words. The control word of g_VekLogParams follows it. */
void NsLogSetControlMask(const unsigned int *mask);
/* Copies the current category mask out (for inspection). */
void NsLogGetControlMask(unsigned int *mask);
void NsLog(unsigned short line, int category, const char *function, const char *text);
void NSLogEnablePLog(int enable);
void NSLogPrintPerformanceLog(unsigned short id, unsigned int value, const char *text);

#ifdef __cplusplus
}
#endif

#endif

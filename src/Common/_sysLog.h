// The library's log convention. Every record goes to the platform sink
// QelLog with a level (1 or 4), a line, the reporting function and a
// message; most carry the header "kt48api.dll:<source file>:LINE <line>".
// Each source file names itself in kSourceFile.
#ifndef KT48_SYSLOG_H
#define KT48_SYSLOG_H

#include "_sysPlatform.h"

#define KT48_LOG_HEADER "kt48api.dll:%s:LINE %d\r\n"

// One record: header, a blank, the message, "\r\n".
#define KT48_LOG(level, line, function, message, ...)                                        \
    QelLog((level), (line), (function), KT48_LOG_HEADER " " message "\r\n", kSourceFile,      \
           (line), ##__VA_ARGS__)

// Two records: the header alone, then a detail without header.
#define KT48_LOG_HEADER_ONLY(level, line, function) \
    QelLog((level), (line), (function), KT48_LOG_HEADER, kSourceFile, (line))

#endif

// The platform calls the library stands on. On the target these are the
// platform's own libraries and the QNX C library; on the host, the host
// platform layer supplies the same names.
#ifndef KT48_SYSPLATFORM_H
#define KT48_SYSPLATFORM_H

#include <INI_OrvaComp.h>
#include <NS_Logger.h>
#include <QelMsg_Client.h>
#include <QelStd.h>
#include <kt48host.h>
#include <qnx_ext.h>

#endif

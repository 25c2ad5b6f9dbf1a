/* Platform messaging library: message nodes and their delivery.
 *
 * A node is a process number (pno, 1..65535) registered by one process.
 * Any thread of any process of the same session sends to it; the
 * registering process receives. Messages are at most QELMSG_MAX_MESSAGE
 * bytes and keep their boundaries. */
#ifndef QELMSG_CLIENT_H
#define QELMSG_CLIENT_H

#ifdef __cplusplus
extern "C" {
#endif

#define QELMSG_MAX_MESSAGE 65536

/* Statuses. */
#define QELMSG_OK 0
#define QELMSG_RCV_CLOSED 1     /* receive: the node was withdrawn while waiting */
#define QELMSG_E_PARAM (-1)     /* bad argument (null buffer, size 0 or too large, pno 0) */
#define QELMSG_E_NONODE (-2)    /* no such node: nobody registered that pno */
#define QELMSG_E_TOOBIG (-3)    /* receive: message larger than the buffer (it is dropped) */
#define QELMSG_E_TRANSPORT (-4) /* the transport failed (see errno) */
#define QELMSG_E_NOTOWNER (-5)  /* receive on a node this process did not register */
#define QELMSG_E_FULL (-6)      /* send: the node's queue is full */
#define QELMSG_E_EMPTY (-7)     /* non-blocking receive: no message waiting, or another thread is receiving */
#define QELMSG_E_INTR (-8)      /* interrupted by a signal */
#define QELMSG_E_REGISTERED (-6) /* register: the pno is held by another live process */

int QelMsg_System_Init(void);
int QelMsg_Process_Init(void);

/* Register pid/tid as the node of pno. pid must be this process.
 * Registering a pno again from the same process updates its thread. */
int QelMsg_RegisterNode_kt48(unsigned short pno, int pid, unsigned long tid);
/* Withdraw this process's node of pno; blocked receivers return 1. */
int QelMsg_UnregisterNode_kt48(unsigned short pno);

/* Deliver size bytes at message to node to. Never blocks: a full queue
 * gives QELMSG_E_FULL. sender and code are recorded in the transmission log. */
int QelMsg_SendMessage_kt48(unsigned short sender, unsigned long to, unsigned short code,
                            const void *message, unsigned long size);

/* Receive one message for node into buffer (size bytes); a and b are set
 * to the message's length and sender process id. */
int QelMsg_ReceiveMessage(unsigned long node, unsigned int *a, unsigned int *b, void *buffer,
                          unsigned long size);
int QelMsg_ReceiveMessageNotBlocked(unsigned long node, unsigned int *a, unsigned int *b,
                                    void *buffer, unsigned long size);

/* Message-channel transmission log: "on", "1" or "all" enables a level-1
 * record per received message; anything else disables it. */
int McDetermineTransmitLogging(const char *text);

#ifdef __cplusplus
}

namespace qelmsg {
/* Transmission log of sends, switched as McDetermineTransmitLogging. */
int QelMsg_DetermineTransmitLogging(char const *text);
}
#endif

#endif

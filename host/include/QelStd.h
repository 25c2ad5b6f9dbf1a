/* Platform standard library: process set-up and named memory regions. */
#ifndef QELSTD_H
#define QELSTD_H

#ifdef __cplusplus
extern "C" {
#endif

/* Access modes of QelStd_SharedMemoryLink. */
#define QELSTD_ACCESS_READ 1
#define QELSTD_ACCESS_WRITE 2
#define QELSTD_ACCESS_READWRITE 3

/* Modes of QelStd_SharedMemoryDelete. */
#define QELSTD_RELEASE_HANDLE 2 /* release the handle; region and mappings stay */
#define QELSTD_REMOVE_REGION 3  /* remove the named region and its listing entry */

/* Prepares the library for this process; safe to call more than once. 0. */
int QelStd_ProcessInitialize(void);

/* create 1: make a new zero-filled region of reqSize bytes; fails when the
 * name is taken. create 0: find the region by name. On success *handle and
 * *size are filled in and 0 is returned; otherwise non-zero. Every region
 * has one entry named after it in the listing directory "/tmp/SHM/". */
int QelStd_SharedMemoryCreate(unsigned int *handle, unsigned int *size, const char *name,
                              unsigned int reqSize, int create);

/* Map the region of handle (size bytes) and store its address in *address. */
int QelStd_SharedMemoryLink(void **address, unsigned int handle, unsigned int size, int access);

/* Mode 2: release *handle. Mode 3: remove the named region (and release
 * *handle when it is non-zero). Mappings already made stay valid. */
int QelStd_SharedMemoryDelete(unsigned int *handle, const char *name, int mode);

/* Unmap a region mapped by QelStd_SharedMemoryLink. */
int QelStd_SharedMemoryUnlink(void *address, unsigned int size);

#ifdef __cplusplus
}
#endif

#endif

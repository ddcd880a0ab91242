/* Named byte FIFOs between one writing and one reading thread. SPDX-License-Identifier: MIT
 *
 * A FIFO is a ring of bytes with blocking on both ends; a transfer waits for at most 100 ms, so a caller retries on -1.
 * At most 16 FIFOs exist at a time. They are found by name when they are created, and by handle afterwards; a handle is
 * never used again, so that stale ones are refused. No code is recorded anywhere.
 *
 * Any thread may call any function at any time, also delete a FIFO while both ends transfer. One thread is to write and
 * one to read; with several on one side, bytes may be lost, or read that were not written. */
#ifndef LUMRA_DATA_FIFO_H
#define LUMRA_DATA_FIFO_H

#include <lumra/export.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Bit of the flags of qsLTEHS_DataFIFOCreate. */
enum lumra_fifo_flag { LUMRA_FIFO_REUSE = 1 };

enum lumra_fifo_direction { LUMRA_FIFO_WRITE = 0, LUMRA_FIFO_READ = 1 };

/* Opens an empty FIFO and makes a cell, 8 bytes that hold its handle.
 *
 * name      at most 255 bytes count; null is the empty name
 * capacity  in bytes; 0 is allowed
 * flags     LUMRA_FIFO_*
 * cellOut   receives the cell, to be given to qsLTEHS_DataFIFOUnreserve; a cell holding 0 where there is no handle,
 *           null where there is no memory for a cell
 *
 * Where a FIFO of that name exists, what it holds decides, not its capacity:
 *   - it holds fewer bytes than `capacity`: it is closed (its transfers return -2) and replaced;
 *   - otherwise, with LUMRA_FIFO_REUSE: it is flushed, and its own handle returned. Both cells then stand for one FIFO;
 *   - otherwise it is forgotten: its handle is refused from now on, transfers that wait in it are not woken.
 *
 * Returns the handle, or 0: 16 FIFOs of other names exist, no memory, or cellOut is null (nothing is made). */
LUMRA_EXPORT uint64_t qsLTEHS_DataFIFOCreate(const char *name, uint32_t capacity, uint32_t flags, uint64_t **cellOut);

/* Closes a FIFO: transfers that wait return -2, those that copy finish first. Returns 0, also for an unknown handle. */
LUMRA_EXPORT int32_t qsLTEHS_DataFIFODelete(uint64_t handle);

/* Closes the FIFO that a cell stands for, frees the cell and sets the pointer to it to null.
 * Returns 0, also where that FIFO is closed already; -2 for a null pointer, or one to no cell. */
LUMRA_EXPORT int32_t qsLTEHS_DataFIFOUnreserve(uint64_t **cell);

/* Writes or reads exactly count bytes.
 *
 * direction            LUMRA_FIFO_WRITE; any other value reads
 * source, destination  the caller's buffer; only the one of the direction is looked at
 * offset               of the first byte in that buffer
 * count                in bytes, at most 2^31 - 1. More than the capacity is waited for, in vain
 *
 * A transfer that has not enough room or bytes waits until the other end makes them; then it goes on without looking
 * again, so that a flush at that moment lets a read return bytes that were flushed. Room or bytes that come without a
 * transfer of the other end (by a flush) wake nobody, and are not looked for when the time is over.
 *
 * Returns count; 0 for a count of 0; -1 after 100 ms; -2 for an unknown handle, a FIFO that closes, a buffer that is
 * null, or a count above 2^31 - 1. */
LUMRA_EXPORT int32_t qsLTEHS_DataFIFO(uint64_t handle, int32_t direction, const void *source, void *destination,
                                      uint32_t offset, uint32_t count);

/* Writes capacity and fill in bytes; either pointer may be null. Returns 0; -2 for an unknown handle (both are 0). */
LUMRA_EXPORT int32_t qsLTEHS_DataFIFO_GetStatus(uint64_t handle, uint32_t *capacity, uint32_t *fill);

/* Empties a FIFO; a transfer that copies at that moment finishes first, a writer that waits for room is not woken.
 * Returns 0; -2 for an unknown handle or a FIFO that closes. */
LUMRA_EXPORT int32_t qsLTEHS_DataFIFO_Flush(uint64_t handle);

/* Returns -312402, always. */
LUMRA_EXPORT int32_t qsLTEHS(void);

#ifdef __cplusplus
}
#endif

#endif

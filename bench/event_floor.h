/* The floor of one event: the bare system calls that recording an event
 * names, with no library code between them. The event benchmarks are read
 * against it. */
#ifndef ORVANE_BENCH_EVENT_FLOOR_H
#define ORVANE_BENCH_EVENT_FLOOR_H

#include <stddef.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Status of `logs_directory`, open of `path` for appending (created when
 * missing), its size from the open handle, one write of `size` bytes, close.
 * Returns 0 when every step succeeded, -1 otherwise. */
int FloorEvent(const char *logs_directory, const char *path, const void *line, size_t size);

#ifdef __cplusplus
}
#endif

#endif

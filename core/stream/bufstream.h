/* The record through which compressed data and its side information flow between kernels and the engine.
 *
 * This is a binary interface, also of plug-ins written in C: field order and widths are fixed. Units are
 * bytes, counts are unsigned 32 bits. A record has one of two directions: an input is written to, an output
 * is read from.
 *
 *     writer:  p = bs->request(bs, n);  fill p[0..n-1];  bs->confirm(bs, n);  bs->auxinfo(bs, 0, id, &info,
 * size); reader:  p = bs->request(bs, n);  use p[0..n-1];   bs->confirm(bs, n);
 *
 * Nothing here waits: no room, or not enough data, is a null block or a short count.
 */
#pragma once

#ifndef __cplusplus
typedef struct bufstream bufstream;
#endif

struct bufstream {
    unsigned (*usable)(struct bufstream* self); /* free room of an input, data at hand of an output */
    /* A block of n contiguous bytes, or null. It is valid until the next call on either record. */
    unsigned char* (*request)(struct bufstream* self, unsigned n);
    /* Commits the first n bytes of the block that was asked for last; the count that was committed. */
    unsigned (*confirm)(struct bufstream* self, unsigned n);
    /* Copies n bytes in or out; the count that was copied. */
    unsigned (*copybytes)(struct bufstream* self, unsigned char* p, unsigned n);
    unsigned (*chunksize)(struct bufstream* self); /* largest block that request can give */
    /* Side information, identifiers in auxinfoid.h. `info` is the caller's; what it holds, and whether it is
     * read or written, depends on `id`. 0 or a value of the identifier; all bits set is a failure. */
    unsigned (*auxinfo)(struct bufstream* self, unsigned offset, unsigned id, void* info, unsigned size);
    unsigned (*split)(struct bufstream* self);       /* the next output file begins; null: no splitting */
    void (*done)(struct bufstream* self, int abort); /* end of writing */
    void (*free)(struct bufstream* self);            /* releases the record; null: its owner does */
    void* reserved[2];                               /* zero */
    unsigned flags;                                  /* BUFSTREAM_WRITER or 0 */
    unsigned (*state)(struct bufstream* self);       /* null in FIFOs and files */
    void* context;                                   /* the object that owns the record */
};

#define BUFSTREAM_WRITER 1u          /* also set on both records of a FIFO */
#define BUFSTREAM_FAILED 0xFFFFFFFFu /* a failed auxinfo or split */

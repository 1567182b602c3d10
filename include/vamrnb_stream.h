/**
 * @file vamrnb_stream.h
 * @brief vamrnb: AMR-NB storage-format streams (".amr" files).
 *
 * A storage-format stream is the magic "#!AMR\n" followed by frames, each a
 * table-of-contents byte and the frame's bits.  The reader takes bytes in any
 * chunking (a whole file, or successive reads from a pipe or socket) and hands
 * out complete frames ready for vamrnbd_decode; the writer emits the magic and
 * checks every frame against its table-of-contents byte.  Framing comes from
 * the table-of-contents byte and vamrnb_tbl_packed_size only.
 *
 * The reader never allocates after creation and holds at most one frame.
 * Nothing here throws.  The header compiles as C11 and as C++17 on its own.
 */
#ifndef VAMRNB_STREAM_H
#define VAMRNB_STREAM_H

#include <stddef.h>
#include <stdint.h>

#include "vamrnb.h"

#ifdef __cplusplus
extern "C" {
#endif

/** The magic that opens every single-channel AMR-NB storage-format stream. */
#define VAMRNB_STREAM_MAGIC "#!AMR\n"
/** Length of VAMRNB_STREAM_MAGIC in bytes. */
#define VAMRNB_STREAM_MAGIC_SIZE 6
/** Largest frame in a stream, table-of-contents byte included (MR122). */
#define VAMRNB_STREAM_MAX_FRAME 32

/**
 * Status values of the stream functions.  0 (AMRNB_OK) and AMRNB_ERR_NO_MEMORY
 * keep their library-wide meaning; the stream layer adds these, none of which
 * any other function of the library returns.  vamrnb_strerror() names them.
 */
enum {
    VAMRNB_STREAM_FRAME        = 1,   /**< vamrnb_stream_read: a frame is ready */
    VAMRNB_STREAM_ERR_MAGIC    = -20, /**< the input does not start with "#!AMR\n" */
    VAMRNB_STREAM_ERR_WIDEBAND = -21, /**< an AMR-WB stream ("#!AMR-WB\n"): not supported */
    VAMRNB_STREAM_ERR_MULTICHANNEL = -22, /**< a multi-channel stream ("#!AMR_MC1.0\n"): not supported */
    VAMRNB_STREAM_ERR_TOC      = -23, /**< a table-of-contents byte with its F bit set */
    VAMRNB_STREAM_ERR_TRUNCATED = -24, /**< the input ended inside a frame */
    VAMRNB_STREAM_ERR_NO_ROOM  = -25, /**< writer: the output buffer is too small */
    VAMRNB_STREAM_ERR_FRAME_SIZE = -26, /**< writer: the frame's size disagrees with its type */
    VAMRNB_STREAM_ERR_ARGUMENT = -27  /**< a required pointer is null */
};

/** One frame of a stream, as handed out by the reader. */
typedef struct vamrnb_stream_frame {
    /** The frame's bytes, table-of-contents byte first.  They lie in the
     *  caller's input when the frame arrived whole in one call, otherwise in
     *  the reader; valid until the next call on the reader. */
    const uint8_t *data;
    /** Bytes at data: vamrnb_tbl_packed_size of the type, at least 1; for a
     *  truncated frame, the bytes that were there. */
    uint32_t size;
    /** Frame type 0..15 (0..7 speech modes, 8 SID, 15 no data). */
    uint8_t type;
    /** Quality bit: 1 good, 0 bad (the decoder conceals a bad frame). */
    uint8_t quality;
    /** The two padding bits of the table-of-contents byte as found; 0 in a
     *  well-formed stream.  The decoder ignores them. */
    uint8_t padding;
    /** Always 0. */
    uint8_t reserved;
    /** Byte offset of the table-of-contents byte from the start of the stream. */
    uint64_t offset;
} vamrnb_stream_frame;

/** Opaque reader state. */
typedef struct vamrnb_stream_reader vamrnb_stream_reader;

/**
 * Creates a reader positioned before the magic.
 * @param error  Optional; receives AMRNB_OK or AMRNB_ERR_NO_MEMORY.
 * @return The reader, or NULL when memory ran out.
 */
VAMRNB_API vamrnb_stream_reader *vamrnb_stream_reader_create(int32_t *error);

/**
 * Returns a reader to its state after creation, ready for a new stream.
 * @param reader  The reader; NULL is ignored.
 */
VAMRNB_API void vamrnb_stream_reader_reset(vamrnb_stream_reader *reader);

/**
 * Releases a reader.
 * @param reader  The reader; NULL is ignored.
 */
VAMRNB_API void vamrnb_stream_reader_delete(vamrnb_stream_reader *reader);

/**
 * Feeds bytes to the reader until one frame is complete or the bytes run out.
 * Call again with the bytes not consumed; a frame is handed out as soon as
 * its last byte arrives.  Errors are sticky: every later call returns the same
 * status, consuming nothing, until vamrnb_stream_reader_reset().
 * @param reader    The reader.
 * @param data      Next bytes of the stream; may be NULL when size is 0.
 * @param size      Number of bytes at data.
 * @param consumed  Receives how many of the bytes were used (always set).
 * @param frame     Receives the frame when VAMRNB_STREAM_FRAME is returned.
 * @return VAMRNB_STREAM_FRAME (a frame is in *frame), AMRNB_OK (all bytes
 *         consumed, no frame complete yet), VAMRNB_STREAM_ERR_MAGIC,
 *         VAMRNB_STREAM_ERR_WIDEBAND, VAMRNB_STREAM_ERR_MULTICHANNEL,
 *         VAMRNB_STREAM_ERR_TOC (vamrnb_stream_reader_offset() gives the
 *         offending byte's offset) or VAMRNB_STREAM_ERR_ARGUMENT.
 */
VAMRNB_API int32_t vamrnb_stream_read(vamrnb_stream_reader *reader, const uint8_t *data, size_t size,
                                      size_t *consumed, vamrnb_stream_frame *frame);

/**
 * Tells the reader that the input has ended and checks that it ended cleanly.
 * @param reader   The reader.
 * @param partial  Optional; on VAMRNB_STREAM_ERR_TRUNCATED receives the cut-off
 *                 frame: its type, offset and the bytes that were there.
 * @return AMRNB_OK after a whole last frame (or the magic alone),
 *         VAMRNB_STREAM_ERR_TRUNCATED when the input ended inside a frame,
 *         VAMRNB_STREAM_ERR_MAGIC when it ended before the magic was complete
 *         (an empty input included), a sticky error of vamrnb_stream_read(),
 *         or VAMRNB_STREAM_ERR_ARGUMENT.
 */
VAMRNB_API int32_t vamrnb_stream_finish(vamrnb_stream_reader *reader, vamrnb_stream_frame *partial);

/**
 * Position of the reader in the stream.
 * @param reader  The reader.
 * @return Bytes consumed since creation or reset; after VAMRNB_STREAM_ERR_TOC,
 *         the offset of the offending byte.  0 for a NULL reader.
 */
VAMRNB_API uint64_t vamrnb_stream_reader_offset(const vamrnb_stream_reader *reader);

/**
 * Writes the magic that opens a stream.
 * @param out      Output buffer.
 * @param room     Bytes available at out (at least VAMRNB_STREAM_MAGIC_SIZE).
 * @param written  Receives the bytes written (always set).
 * @return AMRNB_OK, VAMRNB_STREAM_ERR_NO_ROOM or VAMRNB_STREAM_ERR_ARGUMENT.
 */
VAMRNB_API int32_t vamrnb_stream_write_magic(uint8_t *out, size_t room, size_t *written);

/**
 * Appends one frame, such as vamrnbe_encode produced, to a stream.  The frame
 * must be exactly as long as its table-of-contents byte says; the copy gets
 * the byte's padding bits cleared.
 * @param frame    The frame, table-of-contents byte first.
 * @param size     Bytes at frame.
 * @param out      Output buffer.
 * @param room     Bytes available at out.
 * @param written  Receives the bytes written (always set).
 * @return AMRNB_OK, VAMRNB_STREAM_ERR_TOC (F bit set),
 *         VAMRNB_STREAM_ERR_FRAME_SIZE, VAMRNB_STREAM_ERR_NO_ROOM or
 *         VAMRNB_STREAM_ERR_ARGUMENT.
 */
VAMRNB_API int32_t vamrnb_stream_write_frame(const uint8_t *frame, size_t size, uint8_t *out, size_t room,
                                             size_t *written);

/**
 * Bytes a frame of a given type occupies in a stream, table-of-contents byte
 * included (the types that carry nothing still take their byte).
 * @param type  Frame type 0..15.
 * @return 1..32, or 0 for a type outside 0..15.
 */
VAMRNB_API uint32_t vamrnb_stream_frame_size(int32_t type);

#ifdef __cplusplus
}
#endif

#endif /* VAMRNB_STREAM_H */

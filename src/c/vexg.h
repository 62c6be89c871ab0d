#pragma once

/// The door of libvexg for C, and for every language that calls C functions. Text goes in and comes
/// out in UTF-8, and pixels travel in memory of the caller's.
///
///     char *fault = NULL;
///     if (!vexg_init(&fault)) { puts(fault); vexg_free(fault); return 1; }
///     char *result = vexg_run("<Job>...</Job>", NULL, NULL, &fault);
///
/// Rasters. A function that takes a raster takes one of three texts:
///   - connection strings joined by "|", such as "scene.tif", which open a source;
///   - a job document, whose commands open sources and stand views on them: the raster is the URI
///     that the last command gives. Nothing else may stand in it, so that it can run again;
///   - "[URI]", an object that a job of vexg_run has opened and not closed yet.
/// Rasters of the first two kinds stay open in a store of VEXG_KEPT_RASTERS, of which the one that
/// was used longest ago goes first. A source whose files have changed since is opened anew.
///
/// Ownership: texts that a function returns, and faults, belong to the caller, who gives them to
///            vexg_free. A raster's memory is borrowed for the length of a call.
/// Threads:   every function may be called on any thread, also at the same time.
/// Failure:   a function gives 0 or NULL and sets *fault, unless fault is NULL, to one line that
///            says why. No exception leaves a function. In a child that was forked after vexg_init
///            every function fails, since the threads of the library are not there.

#include <stddef.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

#if defined __GNUC__
#define VEXG_C_EXPORT __attribute__((visibility("default")))
#else
#define VEXG_C_EXPORT
#endif

/// The number of this interface. It rises when a function changes what it takes or gives; functions
/// may be added without that.
#define VEXG_ABI 1

/// Rasters that the store keeps open.
#define VEXG_KEPT_RASTERS 64

/// The order of the axes of a block of pixels, slowest first.
enum vexg_order {
  VEXG_BIP = 0,  ///< lines, samples, bands
  VEXG_BIL = 1,  ///< lines, bands, samples
  VEXG_BSQ = 2   ///< bands, lines, samples
};

/// Bits of a state byte: why a pixel does not count. 0 is a valid pixel.
enum vexg_state { VEXG_NO_DATA = 1, VEXG_MASKED = 2, VEXG_OUTSIDE = 4 };

/// A rectangle of pixels, counted from 0, corners inclusive.
struct vexg_rect {
  uint32_t left, top, right, bottom;
};

/// The block of pixels of one vexg_read or vexg_write.
struct vexg_block {
  struct vexg_rect rect;
  const uint32_t* bands;  ///< from 0, in the order wanted; one may come twice
  uint32_t band_count;
  int32_t order;       ///< a vexg_order
  uint32_t data_type;  ///< the code that vexg_describe gives; a raster of another type is a fault
  uint32_t reserved;   ///< 0
  void* pixels;        ///< without gaps, in the order, aligned for the type
  uint64_t size;       ///< bytes at `pixels`, at least those of the block
  uint8_t* states;     ///< a state byte for each value, in the order; NULL for none
};

/// Gives VEXG_ABI of the library, for a comparison with that of the header.
VEXG_C_EXPORT int vexg_abi(void);

/// Gives the version of the library, "major.minor.patch"; the text stays the library's.
VEXG_C_EXPORT const char* vexg_version(void);

/// Makes the library ready. Every other function does that by itself; a second call does nothing.
/// @return 1, or 0 with a fault.
VEXG_C_EXPORT int vexg_init(char** fault);

/// Runs a job document and waits for its end. What it opens and doesn't close stays open, unless it
/// was aborted.
/// @param abort     a byte that any thread may set to 1 to abort the job; NULL for none. It goes
///                  before a channel that the document names.
/// @param progress  gets the fraction done, 0 to 1, while the job runs; NULL for none.
/// @return the result document, of failed commands too; NULL with a fault when nothing could run.
VEXG_C_EXPORT char* vexg_run(const char* document, uint8_t* abort, double* progress, char** fault);

/// Reads a block of pixels.
/// @param abort  as of vexg_run; looked at between the pieces of a large block.
/// @return 1 when the memory holds the whole block; after 0 it means nothing.
VEXG_C_EXPORT int vexg_read(const char* raster, const struct vexg_block* block, uint8_t* abort,
                            char** fault);

/// Writes a block of pixels; without states all of them are valid. What was written is in the file
/// for certain once the raster is closed.
/// @return 1 when the whole block was taken.
VEXG_C_EXPORT int vexg_write(const char* raster, const struct vexg_block* block, uint8_t* abort,
                             char** fault);

/// Tells what a raster is: size, bands, type, blocks, no-data values, place, levels and details, as
/// a JSON object. docs/c-door.md has its members.
VEXG_C_EXPORT char* vexg_describe(const char* raster, char** fault);

/// Tells what all commands declare, as a JSON array: what `vexg commands --json` prints.
VEXG_C_EXPORT char* vexg_commands(char** fault);

/// Closes a raster of the store, by the text that it was read by; NULL closes all. Nothing happens
/// for one that isn't there.
/// @return 1, or 0 with a fault when a source that was written could not be finished.
VEXG_C_EXPORT int vexg_close(const char* raster, char** fault);

/// Bounds the threads that work at once in this process; 0 takes the bound away.
/// @return how many there are now at most, or 0 with a fault.
VEXG_C_EXPORT int vexg_thread_limit(int threads, char** fault);

/// Gives a text back that a function has returned; NULL does nothing.
VEXG_C_EXPORT void vexg_free(char* text);

#ifdef __cplusplus
}
#endif

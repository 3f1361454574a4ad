/**
 * @file
 * The files and labels of optical discs: Blu-ray (kzbdfs_) and DVD (kzdvdfs_).
 *
 * Two families that read files, list directories, build the paths of a disc's well-known files and
 * read its volume label. The library itself needs neither; they need no start-up and take nothing
 * from its allocator.
 *
 * Each family has a switch, off at first, and a last error. Both are the process's, atomic and
 * without a lock: another thread's failure may be the one that get_error returns, so go by what a
 * call returns. While a family is off, open, seek, read, read_at, close, read_vol_label,
 * get_volume_label and kzdvdfs_exists() do nothing but fail with KZ_DISC_NOT_ON. The names are
 * built, and directories listed, whether it is on or off.
 *
 * Status codes. A failed system call gives, by its `errno`:
 *
 *   ENOENT  KZ_DISC_ERROR_NOT_FOUND         EMFILE  KZ_DISC_ERROR_TOO_MANY_FILES
 *   EACCES  KZ_DISC_ERROR_ACCESS_DENIED     EBADF   KZ_DISC_ERROR_BAD_DESCRIPTOR
 *   EINVAL  KZ_DISC_ERROR_INVALID_ARGUMENT  ENOSPC  KZ_DISC_ERROR_NO_SPACE
 *   any other  KZ_DISC_ERROR_SYSTEM
 *
 * Beside these there are KZ_DISC_ERROR_MEMORY (memory is short, a directory cannot be opened, or a
 * name does not fit), KZ_DISC_ALREADY_ON and KZ_DISC_NOT_ON. Every failure becomes the family's
 * last error, unless a function says otherwise; a success leaves the last error as it was, unless a
 * function says otherwise.
 *
 * Not a security boundary: a link may take a file's place between a check and the opening, links
 * are followed wherever `open` follows them, and opening a pipe waits for its other end.
 */
#ifndef KZSDK_DISC_DISC_H
#define KZSDK_DISC_DISC_H

#include "kzsdk/abs/base.h"
#include "kzsdk/abs/status.h"

KZ_C_BEGIN

/** Bytes that are room enough for every volume label of get_volume_label, with its NUL. */
#define KZ_DISC_LABEL_SIZE 64u

/* ---- Blu-ray: switch and last error --------------------------------------------------------- */

/**
 * Switches the family on.
 *
 * @return 0, and no last error is left; KZ_DISC_ALREADY_ON when it was on.
 */
KZ_API kz_status kzbdfs_initialize(void) KZ_NOEXCEPT;

/** Switches the family off; what is open stays so. @return 0; KZ_DISC_NOT_ON when it was off. */
KZ_API kz_status kzbdfs_shutdown(void) KZ_NOEXCEPT;

/**
 * @return KZ_DISC_ALREADY_ON when the family is on, KZ_DISC_NOT_ON when it is off; never 0. Neither
 *         is kept.
 */
KZ_API kz_status kzbdfs_query_availability(void) KZ_NOEXCEPT;

/** Takes the last error: the next call returns 0. */
KZ_API kz_status kzbdfs_get_error(void) KZ_NOEXCEPT;

/* ---- Blu-ray: files ------------------------------------------------------------------------- */

/**
 * Opens a file for reading, following links.
 *
 * @return A descriptor, which the caller closes with kzbdfs_close() and which started programs
 *         inherit; -1 on failure.
 */
KZ_API int32_t kzbdfs_open(const char* path) KZ_NOEXCEPT;

/**
 * Moves the place in a file.
 *
 * @param offset  Bytes.
 * @param whence  From where: 0 the beginning, 1 the place, 2 the end.
 * @return The new place, in bytes from the beginning; -1 on failure. Any other @p whence fails with
 *         KZ_DISC_ERROR_NOT_FOUND.
 */
KZ_API int64_t kzbdfs_seek(int32_t descriptor, int64_t offset, int32_t whence) KZ_NOEXCEPT;

/**
 * Reads from the place in a file and moves it on.
 *
 * @param buffer  Room for @p count bytes.
 * @param count   At most 2^31 - 1 bytes are read at once.
 * @return Bytes read, fewer at the end of the file and 0 behind it; -1 on failure.
 */
KZ_API int32_t kzbdfs_read(int32_t descriptor, void* buffer, uint32_t count) KZ_NOEXCEPT;

/**
 * Moves to a place and reads there, in two steps: one thread at a time for a descriptor.
 *
 * @param offset  Bytes from the beginning.
 * @return As kzbdfs_read(); -1 too when the place cannot be moved there.
 */
KZ_API int32_t kzbdfs_read_at(int32_t descriptor, int64_t offset, void* buffer,
                              uint32_t count) KZ_NOEXCEPT;

/** Closes a file. @return 0, or why not. */
KZ_API kz_status kzbdfs_close(int32_t descriptor) KZ_NOEXCEPT;

/**
 * Reads the volume label of the disc in /dev/dvd: the UDF volume identifier in sector 32, up to its
 * first white space.
 *
 * IMPORTANT: each success leaves a descriptor of the device open that is not returned and cannot be
 * closed. Call it once for a disc: after about a thousand labels the process cannot open anything
 * any more. (A program that is started does not inherit the descriptor.)
 *
 * What is read is not checked: other bytes than a label come out where sector 32 does not hold the
 * volume descriptor, and none where the device ends earlier. A label of 30 characters, the most
 * that UDF has, is followed by one or two more bytes: its length, and a number. A label stored with
 * 16 bits a character mostly comes out empty.
 *
 * @param root         Must not be null and is not used otherwise: the device is always /dev/dvd, or
 *                     whatever that links to.
 * @param capacity     Bytes of room at @p label. A longer label is cut without notice.
 * @param[out] length  Takes the bytes written, 0 .. 32; 0 on failure.
 * @param[out] label   Takes the label, without a NUL.
 * @return 0, and no last error is left; KZ_DISC_ERROR_INVALID_ARGUMENT when a pointer is null (@p
 *         length is not touched then); else why the device cannot be opened or read.
 */
KZ_API kz_status kzbdfs_read_vol_label(const char* root, uint32_t capacity, uint32_t* length,
                                       char* label) KZ_NOEXCEPT;

/**
 * Reads the volume label of any disc or image that is open: the UDF volume identifier in sector 32.
 *
 * Unlike kzbdfs_read_vol_label() this looks whether the volume is there, returns its label as a
 * whole, white space within included, and leaves nothing open. Spaces at the end are left out, and
 * a label ends at its first NUL. Characters of 8 and of 16 bits become UTF-8; a label in any other
 * form is empty.
 *
 * @param descriptor  From kzbdfs_open(). Its place is moved: one thread at a time for a descriptor.
 * @param[out] label  Takes the label, NUL-terminated; empty on failure.
 * @param size        Bytes of room at @p label, 1 or more. KZ_DISC_LABEL_SIZE is always enough.
 * @return 0; KZ_DISC_ERROR_NOT_FOUND when there is no such volume; KZ_DISC_ERROR_MEMORY when the
 *         label does not fit; KZ_DISC_ERROR_INVALID_ARGUMENT when @p label is null or @p size is 0;
 *         else why the disc cannot be read.
 */
KZ_API kz_status kzbdfs_get_volume_label(int32_t descriptor, char* label,
                                         uint32_t size) KZ_NOEXCEPT;

/* ---- Blu-ray: directories ---------------------------------------------------------------------
 *
 * Handles and entries live on the system heap, not on the library's. One handle with its entries
 * belongs to one thread at a time.
 */

/** An open directory. */
typedef struct kzbdfs_dir kzbdfs_dir;

/** An entry of a directory. */
typedef struct kzbdfs_dirent kzbdfs_dirent;

/** @return '/', what stands between the names of a path. */
KZ_API char kzbdfs_dir_get_delim(void) KZ_NOEXCEPT;

/**
 * Opens a directory.
 *
 * IMPORTANT: a success returns the last error that was pending from other calls, and takes it. Set
 * the handle to null before the call and look at the handle, not at what is returned; or call
 * kzbdfs_get_error() first.
 *
 * @param[out] handle  Takes the directory, which the caller closes; not touched on failure.
 * @return The pending last error, normally 0, when @p handle was set. Else
 *         KZ_DISC_ERROR_INVALID_ARGUMENT when a pointer is null, or KZ_DISC_ERROR_MEMORY when
 *         memory is short or the directory cannot be opened, for whatever reason. Why it could not
 *         be opened becomes the last error; the other two failures do not.
 */
KZ_API kz_status kzbdfs_open_dir(const char* path, kzbdfs_dir** handle) KZ_NOEXCEPT;

/**
 * Reads the next entry, "." and ".." among them, in no order.
 *
 * @return The entry, which the caller frees; null at the end, for null, when reading fails (the
 *         reason becomes the last error), or when memory is short (an entry is passed over then).
 */
KZ_API kzbdfs_dirent* kzbdfs_readdir(kzbdfs_dir* handle) KZ_NOEXCEPT;

/**
 * The name of an entry, without its directory.
 *
 * @return The directory's text: it lasts until the next kzbdfs_readdir() or kzbdfs_close_dir(), and
 *         so does every use of the entry other than freeing it. Null for null.
 */
KZ_API const char* kzbdfs_dirent_get_name(const kzbdfs_dirent* entry) KZ_NOEXCEPT;

/** @return 1 for the entry "."; else 0. */
KZ_API int32_t kzbdfs_dirent_is_current_dir(const kzbdfs_dirent* entry) KZ_NOEXCEPT;

/** @return 1 for the entry ".."; else 0. */
KZ_API int32_t kzbdfs_dirent_is_parent_dir(const kzbdfs_dirent* entry) KZ_NOEXCEPT;

/**
 * @return 1 for a regular file; 0 for everything else, links to a file among it, and when the entry
 *         cannot be looked at (that becomes the last error). A relative path given to
 *         kzbdfs_open_dir() is looked up from where the process is now.
 */
KZ_API int32_t kzbdfs_dirent_is_file(const kzbdfs_dirent* entry) KZ_NOEXCEPT;

/**
 * kzbdfs_dirent_is_file() for directories.
 *
 * The name begins with bn where the others begin with kz; programs link to it under that name.
 */
KZ_API int32_t bnbdfs_dirent_is_dir(const kzbdfs_dirent* entry) KZ_NOEXCEPT;

/** Frees an entry. Null is allowed. */
KZ_API void kzbdfs_free_dirent(kzbdfs_dirent* entry) KZ_NOEXCEPT;

/** Closes a directory. Its entries stay to be freed. Null is allowed. */
KZ_API void kzbdfs_close_dir(kzbdfs_dir* handle) KZ_NOEXCEPT;

/* ---- Blu-ray: names ---------------------------------------------------------------------------
 *
 * Each writes a text, NUL-terminated, into `destination`, which has room for `size` bytes: a text
 * that does not fit is cut. The byte at `size - 1` becomes NUL, however short the text. `root` is
 * where the disc is mounted, with or without a "/" at its end; the root "/" gives "//BDMV/..." and
 * an empty one "/BDMV/...". The two must not overlap.
 *
 * They return 0, and no last error is left; KZ_DISC_ERROR_INVALID_ARGUMENT when a pointer is null
 * or `size` is 0. A text that was cut names another file, and only kzbdfs_get_cert_dirname() may
 * report it: give more room than the root's length and 64 bytes.
 */

/** "Content003.cer" for the number 3. At least three digits; no directory. */
KZ_API kz_status kzbdfs_get_cert_filename(char* destination, uint32_t number,
                                          uint32_t size) KZ_NOEXCEPT;

/**
 * "ROOT/AACS/".
 *
 * @return As the other builders; and KZ_DISC_ERROR_MEMORY when @p size is not above the text's
 *         length modulo 65536. Of a text longer than 65535 bytes 0 may be returned although it was
 *         cut.
 */
KZ_API kz_status kzbdfs_get_cert_dirname(const char* root, char* destination,
                                         uint32_t size) KZ_NOEXCEPT;

/** "ROOT/BDMV/index.bdmv". */
KZ_API kz_status kzbdfs_get_index_bdmv_name(const char* root, char* destination,
                                            uint32_t size) KZ_NOEXCEPT;

/** "ROOT/BDMV/MovieObject.bdmv". */
KZ_API kz_status kzbdfs_get_movieobject_bdmv_name(const char* root, char* destination,
                                                  uint32_t size) KZ_NOEXCEPT;

/** "ROOT/BDMV/PLAYLIST/". */
KZ_API kz_status kzbdfs_get_playlist_dirname(const char* root, char* destination,
                                             uint32_t size) KZ_NOEXCEPT;

/** "ROOT/BDMV/PLAYLIST/00007.mpls" for the number 7. At least five digits. */
KZ_API kz_status kzbdfs_get_playlist_filename(const char* root, uint32_t number, char* destination,
                                              uint32_t size) KZ_NOEXCEPT;

/* ---- DVD: switch, last error and files --------------------------------------------------------
 *
 * As for Blu-ray, with a switch and a last error of its own.
 */

/** As kzbdfs_initialize(). */
KZ_API kz_status kzdvdfs_initialize(void) KZ_NOEXCEPT;

/** As kzbdfs_shutdown(). */
KZ_API kz_status kzdvdfs_shutdown(void) KZ_NOEXCEPT;

/** As kzbdfs_query_availability(). */
KZ_API kz_status kzdvdfs_query_availability(void) KZ_NOEXCEPT;

/** As kzbdfs_get_error(). */
KZ_API kz_status kzdvdfs_get_error(void) KZ_NOEXCEPT;

/** As kzbdfs_open(). */
KZ_API int32_t kzdvdfs_open(const char* path) KZ_NOEXCEPT;

/** As kzbdfs_seek(). */
KZ_API int64_t kzdvdfs_seek(int32_t descriptor, int64_t offset, int32_t whence) KZ_NOEXCEPT;

/** As kzbdfs_read(). */
KZ_API int32_t kzdvdfs_read(int32_t descriptor, void* buffer, uint32_t count) KZ_NOEXCEPT;

/** As kzbdfs_read_at(). */
KZ_API int32_t kzdvdfs_read_at(int32_t descriptor, int64_t offset, void* buffer,
                               uint32_t count) KZ_NOEXCEPT;

/** As kzbdfs_close(). */
KZ_API kz_status kzdvdfs_close(int32_t descriptor) KZ_NOEXCEPT;

/**
 * As kzbdfs_read_vol_label(), with the descriptor that stays open, for the ISO 9660 volume
 * identifier in sector 16. All 32 characters of such a label come out; the spaces that fill it up
 * end it, and so does a space within.
 */
KZ_API kz_status kzdvdfs_read_vol_label(const char* root, uint32_t capacity, uint32_t* length,
                                        char* label) KZ_NOEXCEPT;

/**
 * As kzbdfs_get_volume_label(), for the ISO 9660 volume identifier in sector 16, whose bytes are
 * returned as they are.
 */
KZ_API kz_status kzdvdfs_get_volume_label(int32_t descriptor, char* label,
                                          uint32_t size) KZ_NOEXCEPT;

/**
 * @return 1 when there is a file of any kind at the path, links followed; 0 when not, or when the
 *         process's real user cannot reach it: the last error then says why.
 */
KZ_API int32_t kzdvdfs_exists(const char* path) KZ_NOEXCEPT;

/* ---- DVD: names -------------------------------------------------------------------------------
 *
 * As for Blu-ray, but: a "/" is always put behind the root, so a root that ends in one gives two;
 * with a `size` of 0 nothing is written, and `destination` may be null; and the length of the whole
 * text is returned, without its NUL: it was cut unless that is below `size`. -1 when a pointer is
 * null, and nothing is written. The last error is not touched.
 */

/** "ROOT/VIDEO_TS/VIDEO_TS.IFO". */
KZ_API int32_t kzdvdfs_get_video_ts_ifoname(const char* root, char* destination,
                                            uint32_t size) KZ_NOEXCEPT;

/** "ROOT/VIDEO_TS/VTS_07_0.IFO" for the title set 7. At least two digits. */
KZ_API int32_t kzdvdfs_get_vts_ifoname(const char* root, int32_t title_set, char* destination,
                                       uint32_t size) KZ_NOEXCEPT;

KZ_C_END

#endif

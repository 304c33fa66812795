/* Pictures as pixels: decode a JPEG, PNG or WebP file, resize and rotate, encode pixels as JPEG. Every
 * function may be called on any thread, each handle on one at a time; calls block for as long as disk and
 * decoder take. */
#pragma once

#include <tizen_error.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef enum {
  IMAGE_UTIL_ERROR_NONE = TIZEN_ERROR_NONE,
  IMAGE_UTIL_ERROR_INVALID_PARAMETER = TIZEN_ERROR_INVALID_PARAMETER,
  IMAGE_UTIL_ERROR_OUT_OF_MEMORY = TIZEN_ERROR_OUT_OF_MEMORY,
  IMAGE_UTIL_ERROR_NO_SUCH_FILE = TIZEN_ERROR_NO_SUCH_FILE,
  IMAGE_UTIL_ERROR_INVALID_OPERATION = TIZEN_ERROR_INVALID_OPERATION,
  IMAGE_UTIL_ERROR_NOT_SUPPORTED_FORMAT = TIZEN_ERROR_IMAGE_UTIL | 0x01,
  IMAGE_UTIL_ERROR_PERMISSION_DENIED = TIZEN_ERROR_PERMISSION_DENIED,
} image_util_error_e;

/* Values are the platform's; only 9 is supplied here: bytes blue, green, red, alpha. */
typedef enum {
  IMAGE_UTIL_COLORSPACE_BGRA8888 = 9,
} image_util_colorspace_e;

typedef enum {
  IMAGE_UTIL_DOWNSCALE_1_1 = 0,
  IMAGE_UTIL_DOWNSCALE_1_2,
  IMAGE_UTIL_DOWNSCALE_1_4,
  IMAGE_UTIL_DOWNSCALE_1_8,
} image_util_scale_e;

typedef enum {
  IMAGE_UTIL_ROTATION_NONE = 0,
  IMAGE_UTIL_ROTATION_90 = 1,
  IMAGE_UTIL_ROTATION_180 = 2,
  IMAGE_UTIL_ROTATION_270 = 3,
  IMAGE_UTIL_ROTATION_FLIP_HORZ = 4, /* left and right change places */
  IMAGE_UTIL_ROTATION_FLIP_VERT = 5, /* top and bottom */
} image_util_rotation_e;

typedef struct image_util_decode_s *image_util_decode_h;

/* The caller destroys the handle. */
int image_util_decode_create(image_util_decode_h *handle);
int image_util_decode_destroy(image_util_decode_h handle);
int image_util_decode_set_input_path(image_util_decode_h handle, const char *path);
int image_util_decode_set_colorspace(image_util_decode_h handle, image_util_colorspace_e colorspace);
/* Decode at a fraction of the size, which costs a fraction of the memory; JPEG only, others ignore it. */
int image_util_decode_set_jpeg_downscale(image_util_decode_h handle, image_util_scale_e downscale);
/* Where the run puts the pixels; the caller free()s them. */
int image_util_decode_set_output_buffer(image_util_decode_h handle, unsigned char **dst_buffer);
/* The format is what the file's first bytes say. A file with faults that leave something to see is decoded;
 * a picture is as large as its header says, so look at that before you decode a stranger's file. Metadata is
 * not applied. `size` in bytes; any result may be null. On failure the buffer is left as it was. */
int image_util_decode_run(image_util_decode_h handle, unsigned long *width, unsigned long *height,
                          unsigned long long *size);

/* Bytes that a picture of this size takes. */
int image_util_calculate_buffer_size(int width, int height, image_util_colorspace_e colorspace,
                                     unsigned int *size);

/* Pixels into a buffer of the caller's that has room for them and does not overlap the source. */

/* Scale to *dest_width x *dest_height, whatever the proportions. */
int image_util_resize(unsigned char *dest, int *dest_width, int *dest_height, const unsigned char *src,
                      int src_width, int src_height, image_util_colorspace_e colorspace);
/* Rotate clockwise or flip; tells the size of the result. */
int image_util_rotate(unsigned char *dest, int *dest_width, int *dest_height,
                      image_util_rotation_e dest_rotation, const unsigned char *src, int src_width,
                      int src_height, image_util_colorspace_e colorspace);

/* Write a JPEG (quality 1 to 100; alpha is left out), over whatever the path held. The mode of a new file
 * follows the process's umask. */
int image_util_encode_jpeg(const unsigned char *buffer, int width, int height,
                           image_util_colorspace_e colorspace, int quality, const char *path);

#ifdef __cplusplus
}
#endif

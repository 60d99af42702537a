// The label pictures, read safely: a picture path is whatever the settings hold, so it may
// name a folder, a FIFO, a device or a huge file. Only a regular file is read, opened
// without blocking, within kMaxPictureBytes; its pixels are counted from its header before
// any are decoded, within kMaxPicturePixels, whatever its format.
#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include <cairo.h>

namespace zdr::output_internal {

inline constexpr int64_t kMaxPictureBytes = 32LL << 20;
inline constexpr int64_t kMaxPicturePixels = 25'000'000;

struct CairoSurfaceDeleter {
  void operator()(cairo_surface_t* s) const {
    if (s != nullptr) cairo_surface_destroy(s);
  }
};
using SurfacePtr = std::unique_ptr<cairo_surface_t, CairoSurfaceDeleter>;

// A picture ready for a PDF: PNG, GIF, BMP and TIFF decoded into an image surface; JPEG
// carried as it is (the surface holds its bytes, the pixels are never decoded).
struct LabelPicture {
  SurfacePtr surface;
  int widthPx = 0, heightPx = 0;
};

// Reads the picture at `path` (UTF-8). On failure returns an empty surface and sets
// `problem` to why, in Hebrew, naming the file ("... לא נמצאה", "... אינה קובץ רגיל", ...).
LabelPicture ReadLabelPicture(const std::string& path, std::string& problem);

// Only the picture's size in pixels, read from its header under the same rules; false
// (and `problem`) when it cannot be read.
bool ReadLabelPictureSize(const std::string& path, int& widthPx, int& heightPx,
                          std::string& problem);

}  // namespace zdr::output_internal

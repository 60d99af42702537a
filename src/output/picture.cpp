// Label pictures through gdk-pixbuf, the image loader beside cairo.
#include "output/picture.h"

#include <fcntl.h>
#include <gdk-pixbuf/gdk-pixbuf.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>

namespace zdr::output_internal {
namespace {

struct GObjectDeleter {
  void operator()(void* p) const {
    if (p != nullptr) g_object_unref(p);
  }
};
using LoaderPtr = std::unique_ptr<GdkPixbufLoader, GObjectDeleter>;
using PixbufPtr = std::unique_ptr<GdkPixbuf, GObjectDeleter>;

struct ErrorDeleter {
  void operator()(GError* e) const {
    if (e != nullptr) g_error_free(e);
  }
};
using ErrorPtr = std::unique_ptr<GError, ErrorDeleter>;

class Fd {
 public:
  explicit Fd(int fd) : fd_(fd) {}
  ~Fd() {
    if (fd_ >= 0) ::close(fd_);
  }
  Fd(const Fd&) = delete;
  Fd& operator=(const Fd&) = delete;
  int get() const { return fd_; }

 private:
  int fd_;
};

std::string Quoted(const std::string& path) {
  return "התמונה \"" + path + "\"";
}

// The whole of a regular file. The descriptor is opened without blocking, so a FIFO or a
// device in the picture's place is refused at once instead of waiting for a writer.
bool ReadRegularFile(const std::string& path, std::string& data, std::string& problem) {
  Fd fd(::open(path.c_str(), O_RDONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC));
  if (fd.get() < 0) {
    problem = errno == ENOENT || errno == ENOTDIR
                  ? Quoted(path) + " לא נמצאה"
                  : Quoted(path) + " לא נפתחה: " + std::strerror(errno);
    return false;
  }
  struct stat st {};
  if (::fstat(fd.get(), &st) != 0) {
    problem = Quoted(path) + " לא נפתחה: " + std::strerror(errno);
    return false;
  }
  if (S_ISDIR(st.st_mode)) {
    problem = Quoted(path) + " היא תיקייה ולא קובץ תמונה";
    return false;
  }
  if (!S_ISREG(st.st_mode)) {
    problem = Quoted(path) + " אינה קובץ רגיל";
    return false;
  }
  if (st.st_size > kMaxPictureBytes) {
    problem = Quoted(path) + " גדולה מדי: " + std::to_string(st.st_size >> 20) + " MB (עד " +
              std::to_string(kMaxPictureBytes >> 20) + " MB)";
    return false;
  }
  data.resize(static_cast<size_t>(st.st_size));
  size_t done = 0;
  while (done < data.size()) {
    const ssize_t n = ::read(fd.get(), data.data() + done, data.size() - done);
    if (n < 0 && errno == EINTR) continue;
    if (n < 0) {
      problem = Quoted(path) + " לא נקראה: " + std::strerror(errno);
      return false;
    }
    if (n == 0) break;  // shortened while read
    done += static_cast<size_t>(n);
  }
  data.resize(done);
  return true;
}

enum class Format { kUnknown, kPng, kGif, kJpeg, kBmp, kTiff };

// The format from the file's first bytes; only the raster formats a picture chooser
// offers are taken (an SVG could reach for other files).
Format Sniff(const std::string& d) {
  auto starts = [&](std::string_view magic) { return d.compare(0, magic.size(), magic) == 0; };
  if (starts("\x89PNG\r\n\x1a\n")) return Format::kPng;
  if (starts("GIF87a") || starts("GIF89a")) return Format::kGif;
  if (starts("\xFF\xD8\xFF")) return Format::kJpeg;
  if (starts("BM")) return Format::kBmp;
  if (starts(std::string_view("II*\0", 4)) || starts(std::string_view("MM\0*", 4)))
    return Format::kTiff;
  return Format::kUnknown;
}

const char* LoaderType(Format f) {
  switch (f) {
    case Format::kPng:
      return "png";
    case Format::kGif:
      return "gif";
    case Format::kJpeg:
      return "jpeg";
    case Format::kBmp:
      return "bmp";
    case Format::kTiff:
      return "tiff";
    default:
      return nullptr;
  }
}

// What the loader's header told. A zero size asked of the loader makes it stop before it
// allocates the pixels, as it does for a header-only look.
struct Header {
  int width = 0, height = 0;
  bool seen = false, stop = false;
  bool headerOnly = false;
};

void OnSizePrepared(GdkPixbufLoader* loader, int width, int height, gpointer data) {
  auto* h = static_cast<Header*>(data);
  h->width = width;
  h->height = height;
  h->seen = true;
  if (h->headerOnly || width <= 0 || height <= 0 || int64_t{width} * height > kMaxPicturePixels) {
    h->stop = true;
    gdk_pixbuf_loader_set_size(loader, 0, 0);
  }
}

// Runs the loader over `data`. With `header.headerOnly` it stops at the size; else it
// decodes unless the size is over the cap. Returns the decoded picture or null.
PixbufPtr Load(const std::string& data, Format format, Header& header) {
  GError* raw = nullptr;
  LoaderPtr loader(gdk_pixbuf_loader_new_with_type(LoaderType(format), &raw));
  ErrorPtr error(raw);
  if (!loader) return nullptr;
  g_signal_connect(loader.get(), "size-prepared", G_CALLBACK(OnSizePrepared), &header);
  const auto* bytes = reinterpret_cast<const guchar*>(data.data());
  // In pieces, so that the header is seen before the loader has the whole file.
  constexpr size_t kPiece = 64 << 10;
  bool ok = true;
  for (size_t at = 0; ok && at < data.size() && !header.stop; at += kPiece) {
    raw = nullptr;
    ok = gdk_pixbuf_loader_write(loader.get(), bytes + at, std::min(kPiece, data.size() - at),
                                 &raw) != FALSE;
    error.reset(raw);
  }
  raw = nullptr;
  const bool closed = gdk_pixbuf_loader_close(loader.get(), &raw) != FALSE;
  error.reset(raw);
  if (!ok || !closed || header.stop) return nullptr;
  GdkPixbuf* pixbuf = gdk_pixbuf_loader_get_pixbuf(loader.get());
  if (pixbuf == nullptr) return nullptr;
  g_object_ref(pixbuf);
  return PixbufPtr(pixbuf);
}

// The pixels in cairo's premultiplied form.
SurfacePtr ToSurface(GdkPixbuf* pb) {
  const int w = gdk_pixbuf_get_width(pb), h = gdk_pixbuf_get_height(pb);
  const int channels = gdk_pixbuf_get_n_channels(pb), rowstride = gdk_pixbuf_get_rowstride(pb);
  const bool alpha = gdk_pixbuf_get_has_alpha(pb) != FALSE;
  if (gdk_pixbuf_get_bits_per_sample(pb) != 8 || channels < (alpha ? 4 : 3)) return nullptr;
  SurfacePtr surface(
      cairo_image_surface_create(alpha ? CAIRO_FORMAT_ARGB32 : CAIRO_FORMAT_RGB24, w, h));
  if (cairo_surface_status(surface.get()) != CAIRO_STATUS_SUCCESS) return nullptr;
  cairo_surface_flush(surface.get());
  const guchar* src = gdk_pixbuf_read_pixels(pb);
  unsigned char* dst = cairo_image_surface_get_data(surface.get());
  const int dstride = cairo_image_surface_get_stride(surface.get());
  for (int y = 0; y < h; ++y) {
    const guchar* s = src + static_cast<size_t>(y) * rowstride;
    auto* d = reinterpret_cast<uint32_t*>(dst + static_cast<size_t>(y) * dstride);
    for (int x = 0; x < w; ++x, s += channels) {
      const uint32_t a = alpha ? s[3] : 255;
      auto pre = [a](uint32_t c) { return (c * a + 127) / 255; };
      d[x] = a << 24 | pre(s[0]) << 16 | pre(s[1]) << 8 | pre(s[2]);
    }
  }
  cairo_surface_mark_dirty(surface.get());
  return surface;
}

// The file's bytes and format, and its size from its header, under every cap.
bool ReadChecked(const std::string& path, std::string& data, Format& format, Header& header,
                 std::string& problem) {
  if (!ReadRegularFile(path, data, problem)) return false;
  format = Sniff(data);
  if (format == Format::kUnknown) {
    problem = Quoted(path) + " אינה קובץ PNG, GIF, JPEG, BMP או TIFF";
    return false;
  }
  header.headerOnly = true;
  Load(data, format, header);
  if (!header.seen) {
    problem = Quoted(path) + " פגומה: לא ניתן לקרוא את מידותיה";
    return false;
  }
  if (header.width <= 0 || header.height <= 0 ||
      int64_t{header.width} * header.height > kMaxPicturePixels) {
    problem = Quoted(path) + " גדולה מדי: " + std::to_string(header.width) + "×" +
              std::to_string(header.height) + " נקודות (עד " +
              std::to_string(kMaxPicturePixels / 1'000'000) + " מיליון)";
    return false;
  }
  return true;
}

}  // namespace

bool ReadLabelPictureSize(const std::string& path, int& widthPx, int& heightPx,
                          std::string& problem) {
  std::string data;
  Format format{};
  Header header;
  if (path.empty() || !ReadChecked(path, data, format, header, problem)) return false;
  widthPx = header.width;
  heightPx = header.height;
  return true;
}

LabelPicture ReadLabelPicture(const std::string& path, std::string& problem) {
  LabelPicture p;
  std::string data;
  Format format{};
  Header header;
  if (path.empty()) {
    problem = "לא נבחרה תמונה";
    return p;
  }
  if (!ReadChecked(path, data, format, header, problem)) return p;
  if (format == Format::kJpeg) {
    // The PDF carries the JPEG as it is; the pixels are never decoded.
    SurfacePtr surface(cairo_image_surface_create(CAIRO_FORMAT_RGB24, header.width, header.height));
    auto* bytes = static_cast<unsigned char*>(std::malloc(data.size()));
    if (bytes == nullptr || cairo_surface_status(surface.get()) != CAIRO_STATUS_SUCCESS) {
      std::free(bytes);
      problem = Quoted(path) + ": אין די זיכרון";
      return p;
    }
    std::memcpy(bytes, data.data(), data.size());
    if (cairo_surface_set_mime_data(surface.get(), CAIRO_MIME_TYPE_JPEG, bytes, data.size(),
                                    std::free, bytes) != CAIRO_STATUS_SUCCESS) {
      std::free(bytes);
      problem = Quoted(path) + ": אין די זיכרון";
      return p;
    }
    p.surface = std::move(surface);
  } else {
    Header full;
    PixbufPtr pixbuf = Load(data, format, full);
    if (pixbuf) p.surface = ToSurface(pixbuf.get());
    if (!p.surface) {
      problem = Quoted(path) + " פגומה: לא ניתן לפענח אותה";
      return p;
    }
  }
  p.widthPx = header.width;
  p.heightPx = header.height;
  return p;
}

}  // namespace zdr::output_internal

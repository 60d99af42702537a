// Label sheets on stock as PDF through cairo, with text laid out by pango (HarfBuzz shapes,
// fribidi orders). The core stays free of any window system: cairo writes the PDF itself.
#include "output/pdflabels.h"

#include <cairo-pdf.h>
#include <fcntl.h>
#include <pango/pangocairo.h>
#include <stdlib.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <memory>
#include <optional>
#include <unordered_map>
#include <vector>

#include "common/diskfull.h"
#include "engine/engine.h"
#include "output/outputinternal.h"
#include "output/targetfile.h"
#include "select/select.h"

namespace zdr {
namespace {

using output_internal::LabelFields;

constexpr double kPtPerMm = 72.0 / 25.4;
double Pt(double mm) {
  return mm * kPtPerMm;
}

template <typename T, void (*Free)(T*)>
struct Deleter {
  void operator()(T* p) const {
    if (p != nullptr) Free(p);
  }
};
void UnrefObject(void* p) {
  g_object_unref(p);
}
using CairoPtr = std::unique_ptr<cairo_t, Deleter<cairo_t, cairo_destroy>>;
using SurfacePtr =
    std::unique_ptr<cairo_surface_t, Deleter<cairo_surface_t, cairo_surface_destroy>>;
using FontDescPtr = std::unique_ptr<PangoFontDescription,
                                    Deleter<PangoFontDescription, pango_font_description_free>>;
using ObjectPtr = std::unique_ptr<void, Deleter<void, UnrefObject>>;

// ---- The file: written beside the target with no name, then put in its place ------------

class PdfFile {
 public:
  // The labels hold the customers' names: the file is readable by its owner only.
  PdfFile(const std::string& target, double widthPt, double heightPt)
      : target_(target), out_(target, ReplacingFile::Access::kOwnerOnly) {
    const int fd = ::dup(out_.fd());
    file_ = fd >= 0 ? fdopen(fd, "wb") : nullptr;
    if (file_ == nullptr) {
      const int err = errno;
      if (fd >= 0) ::close(fd);
      throw OutputError("לא ניתן ליצור את הקובץ " + target + ": " + std::strerror(err));
    }
    surface_.reset(cairo_pdf_surface_create_for_stream(&PdfFile::Write, this, widthPt, heightPt));
    cairo_pdf_surface_restrict_to_version(surface_.get(), CAIRO_PDF_VERSION_1_5);
    cairo_pdf_surface_set_metadata(surface_.get(), CAIRO_PDF_METADATA_CREATOR, "ZDRLab");
    cr_.reset(cairo_create(surface_.get()));
  }
  ~PdfFile() {
    cr_.reset();
    surface_.reset();
    if (file_ != nullptr) std::fclose(file_);
  }
  PdfFile(const PdfFile&) = delete;
  PdfFile& operator=(const PdfFile&) = delete;

  cairo_t* cr() { return cr_.get(); }

  // Ends the page and throws when cairo has failed.
  void ShowPage() {
    cairo_show_page(cr_.get());
    Check();
  }

  // Completes the document and puts it in place.
  void Commit() {
    cr_.reset();
    cairo_surface_finish(surface_.get());
    Check();
    surface_.reset();
    std::FILE* f = file_;
    file_ = nullptr;
    const bool closed = std::fclose(f) == 0;
    if (!closed || writeError_ != 0) FailWrite(writeError_ != 0 ? writeError_ : errno);
    out_.Commit();
  }

 private:
  static cairo_status_t Write(void* closure, const unsigned char* data, unsigned int length) {
    auto* self = static_cast<PdfFile*>(closure);
    if (std::fwrite(data, 1, length, self->file_) != length) {
      self->writeError_ = errno != 0 ? errno : EIO;
      return CAIRO_STATUS_WRITE_ERROR;
    }
    return CAIRO_STATUS_SUCCESS;
  }

  void Check() {
    const cairo_status_t s = cr_ ? cairo_status(cr_.get()) : cairo_surface_status(surface_.get());
    if (writeError_ != 0) FailWrite(writeError_);
    if (s != CAIRO_STATUS_SUCCESS) {
      throw OutputError("כתיבת הקובץ " + target_ + " נכשלה: " + cairo_status_to_string(s));
    }
  }

  [[noreturn]] void FailWrite(int err) {
    if (err == ENOSPC || err == EDQUOT) throw OutputError(DiskFullMessage(target_));
    throw OutputError("כתיבת הקובץ " + target_ + " נכשלה: " + std::strerror(err));
  }

  std::string target_;
  ReplacingFile out_;
  std::FILE* file_ = nullptr;
  int writeError_ = 0;
  SurfacePtr surface_;
  CairoPtr cr_;
};

// ---- Text ---------------------------------------------------------------------------

// The Culmus family for a line's font choice: a sans for "Arial (Hebrew)", David, Miriam.
const char* FamilyOf(uint8_t font) {
  switch (font) {
    case 1:
      return "David CLM, DejaVu Serif";
    case 2:
      return "Miriam CLM, DejaVu Sans";
    default:
      return "Simple CLM, DejaVu Sans";
  }
}

struct LineStyle {
  const char* family = FamilyOf(0);
  PangoWeight weight = PANGO_WEIGHT_NORMAL;
  PangoStyle slant = PANGO_STYLE_NORMAL;
  bool underline = false;
  double size = 9;  // points

  static LineStyle Of(const LabelLineDef& d) {
    LineStyle s;
    s.family = FamilyOf(d.Font);
    // "Bolder" on normal text is bold, as a browser shows it.
    s.weight = d.FontWeight == 0 ? PANGO_WEIGHT_NORMAL : PANGO_WEIGHT_BOLD;
    s.slant = d.FontItalic == 1 ? PANGO_STYLE_ITALIC : PANGO_STYLE_NORMAL;
    s.underline = d.FontUL == 1;
    s.size = std::max<double>(d.FontSize, kMinLabelPointSize);
    return s;
  }
};

// Single-line layouts in points, right to left, without hinting or rounding so that what
// is measured is what lands on the page.
class TextSetter {
 public:
  TextSetter() {
    fontMap_.reset(pango_cairo_font_map_new());
    context_.reset(pango_font_map_create_context(static_cast<PangoFontMap*>(fontMap_.get())));
    PangoContext* ctx = context();
    pango_cairo_context_set_resolution(ctx, 72);
    cairo_font_options_t* options = cairo_font_options_create();
    cairo_font_options_set_hint_metrics(options, CAIRO_HINT_METRICS_OFF);
    cairo_font_options_set_hint_style(options, CAIRO_HINT_STYLE_NONE);
    cairo_font_options_set_antialias(options, CAIRO_ANTIALIAS_GRAY);
    pango_cairo_context_set_font_options(ctx, options);
    cairo_font_options_destroy(options);
    pango_context_set_round_glyph_positions(ctx, FALSE);
    pango_context_set_base_dir(ctx, PANGO_DIRECTION_RTL);
    desc_.reset(pango_font_description_new());
  }

  // A new layout of this setter's context.
  ObjectPtr NewLayout() {
    PangoLayout* l = pango_layout_new(context());
    pango_layout_set_auto_dir(l, FALSE);
    pango_layout_set_single_paragraph_mode(l, TRUE);
    return ObjectPtr(l);
  }

  void Set(PangoLayout* l, const LineStyle& style, double size, const std::string& text) {
    pango_font_description_set_family_static(desc_.get(), style.family);
    pango_font_description_set_weight(desc_.get(), style.weight);
    pango_font_description_set_style(desc_.get(), style.slant);
    pango_font_description_set_size(desc_.get(), static_cast<int>(size * PANGO_SCALE + 0.5));
    pango_layout_set_font_description(l, desc_.get());
    pango_layout_set_text(l, text.data(), static_cast<int>(text.size()));
  }

  static double Width(PangoLayout* l) {
    PangoRectangle logical;
    pango_layout_get_extents(l, nullptr, &logical);
    return logical.width / double(PANGO_SCALE);
  }
  static double Height(PangoLayout* l) {
    PangoRectangle logical;
    pango_layout_get_extents(l, nullptr, &logical);
    return logical.height / double(PANGO_SCALE);
  }

 private:
  PangoContext* context() { return static_cast<PangoContext*>(context_.get()); }
  ObjectPtr fontMap_, context_;
  FontDescPtr desc_;
};

// Draws one glyph run with its text, the glyphs left to right and every cluster naming the
// characters it shows in reading order. A reader that turns right-to-left words back into
// reading order then gets the text exactly, mirrored brackets included.
void DrawRun(cairo_t* cr, const PangoGlyphItem* run, const char* text, double x, double baseline,
             std::vector<cairo_glyph_t>& glyphs, std::vector<cairo_text_cluster_t>& clusters,
             std::string& runText) {
  const PangoItem* item = run->item;
  const PangoGlyphString* gs = run->glyphs;
  cairo_scaled_font_t* font =
      pango_cairo_font_get_scaled_font(reinterpret_cast<PangoCairoFont*>(item->analysis.font));
  if (font == nullptr || cairo_scaled_font_status(font) != CAIRO_STATUS_SUCCESS) return;
  glyphs.clear();
  clusters.clear();
  runText.clear();
  // The byte where each cluster's text ends: the next cluster's start in reading order.
  thread_local std::vector<int> starts;
  starts.assign(gs->log_clusters, gs->log_clusters + gs->num_glyphs);
  std::sort(starts.begin(), starts.end());
  starts.erase(std::unique(starts.begin(), starts.end()), starts.end());
  double gx = x;
  int i = 0;
  while (i < gs->num_glyphs) {
    const int start = gs->log_clusters[i];
    int count = 0;
    for (; i < gs->num_glyphs && gs->log_clusters[i] == start; ++i) {
      const PangoGlyphInfo& g = gs->glyphs[i];
      if ((g.glyph & PANGO_GLYPH_UNKNOWN_FLAG) == 0 && g.glyph != PANGO_GLYPH_EMPTY) {
        glyphs.push_back({g.glyph, gx + g.geometry.x_offset / double(PANGO_SCALE),
                          baseline + g.geometry.y_offset / double(PANGO_SCALE)});
        ++count;
      }
      gx += g.geometry.width / double(PANGO_SCALE);
    }
    const auto next = std::upper_bound(starts.begin(), starts.end(), start);
    const int end = next == starts.end() ? item->length : *next;
    if (end <= start && count == 0) continue;
    runText.append(text + item->offset + start, end - start);
    clusters.push_back({end - start, count});
  }
  if (glyphs.empty()) return;
  cairo_set_scaled_font(cr, font);
  cairo_show_text_glyphs(cr, runText.data(), static_cast<int>(runText.size()), glyphs.data(),
                         static_cast<int>(glyphs.size()), clusters.data(),
                         static_cast<int>(clusters.size()),
                         static_cast<cairo_text_cluster_flags_t>(0));
}

// Draws a single-line layout with its logical box's top-left corner at (x, top).
class LinePainter {
 public:
  void Draw(cairo_t* cr, PangoLayout* layout, double x, double top, bool underline) {
    const char* text = pango_layout_get_text(layout);
    PangoLayoutIter* it = pango_layout_get_iter(layout);
    const double baseline = top + pango_layout_iter_get_baseline(it) / double(PANGO_SCALE);
    PangoFont* firstFont = nullptr;
    do {
      PangoLayoutRun* run = pango_layout_iter_get_run_readonly(it);
      if (run == nullptr) continue;
      if (firstFont == nullptr) firstFont = run->item->analysis.font;
      PangoRectangle logical;
      pango_layout_iter_get_run_extents(it, nullptr, &logical);
      DrawRun(cr, run, text, x + logical.x / double(PANGO_SCALE), baseline, glyphs_, clusters_,
              runText_);
    } while (pango_layout_iter_next_run(it));
    pango_layout_iter_free(it);
    if (underline && firstFont != nullptr) {
      PangoFontMetrics* m = pango_font_get_metrics(firstFont, nullptr);
      const double position = pango_font_metrics_get_underline_position(m) / double(PANGO_SCALE);
      const double thickness =
          std::max(0.25, pango_font_metrics_get_underline_thickness(m) / double(PANGO_SCALE));
      pango_font_metrics_unref(m);
      cairo_rectangle(cr, x, baseline - position, TextSetter::Width(layout), thickness);
      cairo_fill(cr);
    }
  }

 private:
  std::vector<cairo_glyph_t> glyphs_;
  std::vector<cairo_text_cluster_t> clusters_;
  std::string runText_;
};

// Text safe for a single line: valid UTF-8, line breaks and tabs as blanks.
std::string OneLine(std::string text) {
  if (!g_utf8_validate(text.data(), static_cast<gssize>(text.size()), nullptr)) {
    gchar* valid = g_utf8_make_valid(text.data(), static_cast<gssize>(text.size()));
    text = valid;
    g_free(valid);
  }
  for (char& c : text) {
    if (c == '\r' || c == '\n' || c == '\t' || c == '\0') c = ' ';
  }
  return text;
}

// ---- Pictures -----------------------------------------------------------------------

struct Picture {
  SurfacePtr surface;
  double width = 0, height = 0;  // points, at 96 pixels to the inch
};

std::string ReadWholeFile(const std::string& path) {
  std::ifstream in(std::filesystem::path(std::u8string(path.begin(), path.end())),
                   std::ios::binary);
  if (!in) return {};
  return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

// Width and height from a JPEG's frame header.
bool JpegSize(const std::string& data, int& width, int& height) {
  size_t i = 2;
  while (i + 9 < data.size()) {
    if (static_cast<unsigned char>(data[i]) != 0xFF) return false;
    const unsigned char marker = static_cast<unsigned char>(data[i + 1]);
    const size_t length =
        (static_cast<unsigned char>(data[i + 2]) << 8) | static_cast<unsigned char>(data[i + 3]);
    const bool frame =
        marker >= 0xC0 && marker <= 0xCF && marker != 0xC4 && marker != 0xC8 && marker != 0xCC;
    if (frame) {
      height =
          (static_cast<unsigned char>(data[i + 5]) << 8) | static_cast<unsigned char>(data[i + 6]);
      width =
          (static_cast<unsigned char>(data[i + 7]) << 8) | static_cast<unsigned char>(data[i + 8]);
      return width > 0 && height > 0;
    }
    i += 2 + length;
  }
  return false;
}

cairo_status_t ReadFromString(void* closure, unsigned char* data, unsigned int length) {
  auto* view = static_cast<std::string_view*>(closure);
  if (view->size() < length) return CAIRO_STATUS_READ_ERROR;
  std::memcpy(data, view->data(), length);
  view->remove_prefix(length);
  return CAIRO_STATUS_SUCCESS;
}

// A PNG or JPEG picture, or nothing when the file is missing or of another kind.
std::optional<Picture> LoadPicture(const std::string& path) {
  if (path.empty()) return std::nullopt;
  std::string data = ReadWholeFile(path);
  Picture p;
  if (data.size() > 8 && data.compare(0, 8, "\x89PNG\r\n\x1a\n") == 0) {
    std::string_view view(data);
    p.surface.reset(cairo_image_surface_create_from_png_stream(&ReadFromString, &view));
    if (cairo_surface_status(p.surface.get()) != CAIRO_STATUS_SUCCESS) return std::nullopt;
    p.width = cairo_image_surface_get_width(p.surface.get());
    p.height = cairo_image_surface_get_height(p.surface.get());
  } else if (data.size() > 4 && static_cast<unsigned char>(data[0]) == 0xFF &&
             static_cast<unsigned char>(data[1]) == 0xD8) {
    int w = 0, h = 0;
    if (!JpegSize(data, w, h) || int64_t{w} * h > 40'000'000) return std::nullopt;
    // The PDF carries the JPEG as it is; the pixels are never decoded.
    p.surface.reset(cairo_image_surface_create(CAIRO_FORMAT_RGB24, w, h));
    auto* bytes = static_cast<unsigned char*>(std::malloc(data.size()));
    if (bytes == nullptr) return std::nullopt;
    std::memcpy(bytes, data.data(), data.size());
    if (cairo_surface_set_mime_data(p.surface.get(), CAIRO_MIME_TYPE_JPEG, bytes, data.size(),
                                    std::free, bytes) != CAIRO_STATUS_SUCCESS) {
      std::free(bytes);
      return std::nullopt;
    }
    p.width = w;
    p.height = h;
  } else {
    return std::nullopt;
  }
  p.width *= 0.75;  // 96 pixels to the inch, as a browser shows it
  p.height *= 0.75;
  return p;
}

// ---- One label ------------------------------------------------------------------------

// What goes on a label, top to bottom.
struct LabelItem {
  int picture = -1;  // 0 top, 1 bottom; -1 for a text line
  int style = 0;     // the line's appearance settings, 0..7
  std::string text;
};

class LabelPainter {
 public:
  LabelPainter(const LabelSettings& labels, std::array<std::optional<Picture>, 2>& pictures)
      : pictures_(pictures) {
    for (int i = 0; i < 8; ++i) styles_[i] = LineStyle::Of(labels.LabelDefs[i]);
  }

  // Draws `items` inside `box` (points). Returns false when some did not fit.
  bool Paint(cairo_t* cr, const std::vector<LabelItem>& items, double bx, double by, double bw,
             double bh, double padding) {
    const double x0 = bx + padding, top = by + padding;
    const double width = bw - 2 * padding, height = bh - 2 * padding;
    while (layouts_.size() < items.size()) layouts_.push_back(setter_.NewLayout());
    if (cache_.size() >= kCachedLines) cache_.clear();
    sizes_.assign(items.size(), 0);
    heights_.assign(items.size(), 0);
    natural_.assign(items.size(), nullptr);
    double total = 0;
    for (size_t i = 0; i < items.size(); ++i) {
      const LabelItem& item = items[i];
      if (item.picture >= 0) {
        const Picture& p = *pictures_[item.picture];
        const double scale = std::min(1.0, width / p.width);
        heights_[i] = p.height * scale;
      } else {
        const LineStyle& s = styles_[item.style];
        PangoLayout* l = natural_[i] = Natural(item, i);
        const double natural = TextSetter::Width(l);
        double size = s.size;
        // Width scales with the size: shrink a wide line to fit, not below the minimum.
        if (natural > width) size = std::max(kMinLabelPointSize, s.size * width / natural * 0.999);
        sizes_[i] = size;
        heights_[i] = TextSetter::Height(l) * size / s.size;
      }
      total += heights_[i];
    }
    // Too tall together: every line shrinks alike.
    double factor = 1;
    if (total > height) factor = height / total;

    bool complete = true;
    double y = top;
    cairo_set_source_rgb(cr, 0, 0, 0);
    for (size_t i = 0; i < items.size(); ++i) {
      const LabelItem& item = items[i];
      if (item.picture >= 0) {
        const Picture& p = *pictures_[item.picture];
        const double scale = std::min(1.0, width / p.width) * factor;
        const double h = p.height * scale, w = p.width * scale;
        if (y + h > top + height + 0.01) {
          complete = false;
          break;
        }
        cairo_save(cr);
        cairo_translate(cr, x0 + (width - w) / 2, y);
        cairo_scale(cr, scale * 0.75, scale * 0.75);  // pixels to points
        cairo_set_source_surface(cr, p.surface.get(), 0, 0);
        cairo_paint(cr);
        cairo_restore(cr);
        y += h;
        continue;
      }
      const LineStyle& s = styles_[item.style];
      const double size = std::max(kMinLabelPointSize, sizes_[i] * factor);
      PangoLayout* l = natural_[i];
      if (size != s.size || TextSetter::Width(l) > width) {
        if (l != Layout(i) || size != s.size) setter_.Set(Layout(i), s, size, item.text);
        l = Layout(i);
      }
      const double h = TextSetter::Height(l);
      if (y + h > top + height + 0.01) {
        complete = false;
        break;
      }
      if (TextSetter::Width(l) > width) Ellipsize(l, s, size, item.text, width);
      painter_.Draw(cr, l, x0 + width - TextSetter::Width(l), y, s.underline);
      y += h;
    }
    return complete;
  }

 private:
  // Lines kept laid out at their own size: the fixed word, cities, contacts and the like
  // repeat from label to label.
  static constexpr size_t kCachedLines = 8192;

  PangoLayout* Layout(size_t i) { return static_cast<PangoLayout*>(layouts_[i].get()); }

  // The item's line laid out at its style's own size: kept from the second time it is
  // seen, laid out in the item's own layout before that.
  PangoLayout* Natural(const LabelItem& item, size_t i) {
    key_.assign(1, static_cast<char>('0' + item.style));
    key_ += item.text;
    auto it = cache_.find(key_);
    if (it != cache_.end() && it->second) return static_cast<PangoLayout*>(it->second.get());
    const LineStyle& s = styles_[item.style];
    if (it == cache_.end()) {
      cache_.emplace(key_, nullptr);  // seen once
      setter_.Set(Layout(i), s, s.size, item.text);
      return Layout(i);
    }
    it->second = setter_.NewLayout();
    setter_.Set(static_cast<PangoLayout*>(it->second.get()), s, s.size, item.text);
    return static_cast<PangoLayout*>(it->second.get());
  }

  // The longest beginning of `text` that fits `width` with an ellipsis after it.
  void Ellipsize(PangoLayout* l, const LineStyle& s, double size, const std::string& text,
                 double width) {
    std::vector<size_t> cuts;  // byte offsets of character boundaries, in order
    for (const char* p = text.data(); p < text.data() + text.size(); p = g_utf8_next_char(p)) {
      cuts.push_back(static_cast<size_t>(p - text.data()));
    }
    auto candidate = [&](size_t n) {
      std::string t = text.substr(0, n == cuts.size() ? text.size() : cuts[n]);
      while (!t.empty() && t.back() == ' ') t.pop_back();
      return t + "…";
    };
    size_t lo = 0, hi = cuts.size();  // candidate(lo) fits or lo is 0
    while (lo < hi) {
      const size_t mid = (lo + hi + 1) / 2;
      setter_.Set(l, s, size, candidate(mid));
      if (TextSetter::Width(l) <= width) {
        lo = mid;
      } else {
        hi = mid - 1;
      }
    }
    setter_.Set(l, s, size, candidate(lo));
  }

  std::array<std::optional<Picture>, 2>& pictures_;
  std::array<LineStyle, 8> styles_;
  TextSetter setter_;
  LinePainter painter_;
  std::vector<ObjectPtr> layouts_;  // one per item, for lines at another size
  std::unordered_map<std::string, ObjectPtr> cache_;
  std::string key_;
  std::vector<PangoLayout*> natural_;
  std::vector<double> sizes_, heights_;
};

// A field's text on a label; a Null field is an empty line that keeps its place.
std::string FieldText(const db::Value& v) {
  std::string out;
  output_internal::AppendValueText(v, out);
  return OneLine(std::move(out));
}

// The account key with every run of blanks as one, as the HTML sheet spreads it.
std::string KeyText(const db::Value& v) {
  std::string text = FieldText(v), out;
  for (char c : text) {
    if (c == ' ' && !out.empty() && out.back() == ' ') continue;
    out += c;
  }
  return out;
}

// The lines of one recipient in the HTML sheet's order and with its switches.
void BuildItems(const db::Snapshot& rs, const LabelFields& f, const Panel& panel,
                const std::array<bool, 2>& havePicture, std::vector<LabelItem>& items) {
  items.clear();
  auto on = [&](int i) { return Panel::On(panel.ChkTitle[i]); };
  auto line = [&](int style, std::string text) { items.push_back({-1, style, std::move(text)}); };
  if (Panel::On(panel.ChkLogo[0]) && havePicture[0]) items.push_back({0, 0, {}});
  if (on(0)) line(0, "לכבוד");
  if (on(1)) line(1, FieldText(rs.Field(f.name)));
  if (on(2)) line(2, KeyText(rs.Field(f.key)));
  if (on(3)) line(3, FieldText(rs.Field(f.details)));
  if (on(4)) line(4, FieldText(rs.Field(f.address)));
  if (on(6)) line(6, FieldText(rs.Field(f.district)));
  if (on(5) && on(8)) {
    line(5, FieldText(rs.Field(f.city)) + "    " + FieldText(rs.Field(f.zip)));
  } else if (on(8)) {
    line(5, FieldText(rs.Field(f.zip)));
  } else if (on(5)) {
    line(5, FieldText(rs.Field(f.city)));
  }
  if (on(7)) line(7, FieldText(rs.Field(f.telephone)));
  if (Panel::On(panel.ChkLogo[1]) && havePicture[1]) items.push_back({1, 0, {}});
}

void CheckStock(const LabelStock& stock) {
  const std::string problem = LabelStockProblem(stock);
  if (!problem.empty()) throw OutputError("תבנית המדבקות " + stock.id + ": " + problem);
}

// ---- The calibration page -------------------------------------------------------------

void Line(cairo_t* cr, double x1, double y1, double x2, double y2) {
  cairo_move_to(cr, Pt(x1), Pt(y1));
  cairo_line_to(cr, Pt(x2), Pt(y2));
}

// A figure of a scale, centred on (xMm, yMm) or with its right end there (`align` 0.5 or 1),
// isolated left to right so that a minus stays before its digits.
void SmallText(cairo_t* cr, TextSetter& setter, LinePainter& painter, PangoLayout* l,
               const std::string& text, double size, double xMm, double yMm, double align) {
  LineStyle s;
  setter.Set(l, s, size, "\u2066" + text + "\u2069");
  const double w = TextSetter::Width(l), h = TextSetter::Height(l);
  painter.Draw(cr, l, Pt(xMm) - w * align, Pt(yMm) - h / 2, false);
}

}  // namespace

void CreateLabPdf(const std::string& pFileName, const std::string& pDBFile, const Panel& panel,
                  const DocTypeTable& docTypes, const std::string& selectDbPath,
                  const LabelSettings& labels, const LabelStock& stock, StockOffset offset,
                  UserSeam& ui) {
  CheckStock(stock);
  // Start and copies as the HTML sheet reads them; the stock gives rows and columns.
  Panel grid = panel;
  grid.txtRows = std::to_string(stock.rows);
  grid.txtCols = std::to_string(stock.cols);
  const SheetGeometry g = ReadSheetGeometry(grid, true);
  const int64_t perPage = stock.LabelsPerPage();

  ProgressReporter progress(ui, 1);
  db::Database database = db::Database::Open(pDBFile);
  // The rows are read as the pages are drawn; their number is known when the snapshot opens.
  db::Snapshot rs = database.OpenSnapshot(BuildRecipientsStatement(panel, docTypes, selectDbPath),
                                          db::SnapshotKind::Forward);
  const int64_t count = rs.TotalRows();
  const int64_t start = std::max<int64_t>(g.start, 1);
  const int64_t total = count == 0 ? 0 : g.copies * (start + count - 1);
  const int64_t pages = (total + perPage - 1) / perPage;
  if (pages == 0) {
    throw OutputError(count == 0 ? "אין מדבקות להדפסה: לא נמצאו נמענים"
                                 : "אין מדבקות להדפסה: מספר העותקים הוא 0");
  }

  std::array<std::optional<Picture>, 2> pictures;
  std::array<bool, 2> havePicture{};
  for (int i = 0; i < 2; ++i) {
    if (!Panel::On(panel.ChkLogo[i])) continue;
    pictures[i] = LoadPicture(labels.LabPics[i]);
    havePicture[i] = pictures[i].has_value();
    if (!havePicture[i]) {
      ui.ShowMessage("התמונה \"" + labels.LabPics[i] +
                         "\" לא נמצאה או שאינה קובץ PNG או JPEG, והמדבקות הודפסו בלעדיה",
                     kTitleMessage, MsgIcon::Information);
    }
  }

  PdfFile file(pFileName, Pt(stock.pageWidth), Pt(stock.pageHeight));
  cairo_t* cr = file.cr();
  LabelPainter painter(labels, pictures);
  const LabelFields fields(rs);
  std::vector<LabelItem> items;
  int64_t copy = 0;
  int64_t cut = 0;
  ProgressReporter pageProgress(ui, static_cast<double>(pages));
  for (int64_t page = 1; page <= pages; ++page) {
    for (int position = 1; position <= perPage && !rs.AtEnd(); ++position) {
      if (page == 1 && position < start) continue;
      if (copy == 0) BuildItems(rs, fields, panel, havePicture, items);
      const LabelBox box = StockLabelBox(stock, position, offset);
      if (!painter.Paint(cr, items, Pt(box.x), Pt(box.y), Pt(box.width), Pt(box.height),
                         Pt(stock.padding))) {
        ++cut;
      }
      if (++copy == g.copies) {
        copy = 0;
        rs.MoveNext();
      }
    }
    file.ShowPage();
    pageProgress.Update(static_cast<double>(page));
  }
  file.Commit();
  if (cut > 0) {
    ui.ShowMessage("ב-" + std::to_string(cut) +
                       " מדבקות לא נכנסו כל השורות גם בגופן הקטן ביותר; השורות האחרונות הושמטו",
                   kTitleAttention, MsgIcon::Exclamation);
  }
}

void CreateCalibrationPdf(const std::string& pFileName, const LabelStock& stock,
                          StockOffset offset) {
  CheckStock(stock);
  PdfFile file(pFileName, Pt(stock.pageWidth), Pt(stock.pageHeight));
  cairo_t* cr = file.cr();
  TextSetter setter;
  LinePainter painter;
  ObjectPtr layout = setter.NewLayout();
  PangoLayout* l = static_cast<PangoLayout*>(layout.get());
  cairo_set_source_rgb(cr, 0, 0, 0);
  cairo_set_line_width(cr, 0.4);

  // Every label's outline, and a cross on each of its corners.
  constexpr double kArm = 3;
  for (int p = 1; p <= stock.LabelsPerPage(); ++p) {
    const LabelBox b = StockLabelBox(stock, p, offset);
    cairo_rectangle(cr, Pt(b.x), Pt(b.y), Pt(b.width), Pt(b.height));
    for (const double cx : {b.x, b.x + b.width}) {
      for (const double cy : {b.y, b.y + b.height}) {
        Line(cr, cx - kArm, cy, cx + kArm, cy);
        Line(cr, cx, cy - kArm, cx, cy + kArm);
      }
    }
  }
  cairo_stroke(cr);

  // A millimetre scale along the top and the right edge: where the printer's own margin
  // begins shows as the first tick printed.
  cairo_set_line_width(cr, 0.25);
  for (int mm = 0; mm <= static_cast<int>(stock.pageWidth); ++mm) {
    const double len = mm % 10 == 0 ? 4 : mm % 5 == 0 ? 2.5 : 1.5;
    Line(cr, mm, 0, mm, len);
  }
  for (int mm = 0; mm <= static_cast<int>(stock.pageHeight); ++mm) {
    const double len = mm % 10 == 0 ? 4 : mm % 5 == 0 ? 2.5 : 1.5;
    Line(cr, stock.pageWidth - len, mm, stock.pageWidth, mm);
  }
  cairo_stroke(cr);
  for (int mm = 10; mm < static_cast<int>(stock.pageWidth) - 5; mm += 10) {
    SmallText(cr, setter, painter, l, std::to_string(mm), 5, mm, 5.5, 0.5);
  }
  for (int mm = 10; mm < static_cast<int>(stock.pageHeight) - 5; mm += 10) {
    SmallText(cr, setter, painter, l, std::to_string(mm), 5, stock.pageWidth - 6, mm, 1);
  }

  // Offset scales from -10 to +10 mm across an inner edge of the labels: the left edge of
  // the right column, in the top margin, and the top edge of the second row, in the right
  // margin. Holding the page over a sheet of stock, the stock's edge falls on the offset to
  // set (plus to the right and down).
  const LabelBox first = StockLabelBox(stock, 1, offset);
  const double refX = stock.cols > 1 ? first.x : first.x + first.width / 2;
  const double refY = stock.rows > 1 ? first.y + stock.pitchY : first.y + first.height / 2;
  const double scaleY = 12, scaleX = stock.pageWidth - 14;
  cairo_set_line_width(cr, 0.3);
  for (int t = -10; t <= 10; ++t) {
    const double len = t == 0 ? 5 : t % 5 == 0 ? 3.5 : 2;
    Line(cr, refX + t, scaleY - len / 2, refX + t, scaleY + len / 2);
    Line(cr, scaleX - len / 2, refY + t, scaleX + len / 2, refY + t);
  }
  Line(cr, refX - 10, scaleY, refX + 10, scaleY);
  Line(cr, scaleX, refY - 10, scaleX, refY + 10);
  cairo_stroke(cr);
  for (int t = -10; t <= 10; t += 5) {
    SmallText(cr, setter, painter, l, std::to_string(t), 5, refX + t, scaleY + 4, 0.5);
    SmallText(cr, setter, painter, l, std::to_string(t), 5, scaleX - 3.5, refY + t, 1);
  }

  // What the page is, in the middle of the page on a white ground.
  const std::vector<std::string> lines = {
      "דף כיול לתבנית " + stock.id,
      // Each figure isolated left to right, so that a minus stays before its digits.
      "היסט נוכחי: אופקי \u2066" + FormatMm(offset.x) + "\u2069 מ\"מ, אנכי \u2066" +
          FormatMm(offset.y) + "\u2069 מ\"מ",
      "הדפיסו על נייר רגיל והניחו מעל גיליון מדבקות מול האור.",
      "קראו בסרגלים את מקום קצה המדבקה והוסיפו אותו להיסט (ימינה ולמטה חיובי).",
  };
  const LineStyle s;
  double y = stock.pageHeight / 2 - 10;
  for (const std::string& text : lines) {
    setter.Set(l, s, 9, text);
    const double w = TextSetter::Width(l), h = TextSetter::Height(l);
    const double x = Pt(stock.pageWidth / 2) - w / 2;
    cairo_set_source_rgb(cr, 1, 1, 1);
    cairo_rectangle(cr, x - 2, Pt(y) - 1, w + 4, h + 2);
    cairo_fill(cr);
    cairo_set_source_rgb(cr, 0, 0, 0);
    painter.Draw(cr, l, x, Pt(y), false);
    y += h / kPtPerMm + 1;
  }
  file.ShowPage();
  file.Commit();
}

}  // namespace zdr

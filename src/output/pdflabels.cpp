// Label sheets on stock as PDF through cairo, with text laid out by pango (HarfBuzz shapes,
// fribidi orders). The core stays free of any window system: cairo writes the PDF itself.
#include "output/pdflabels.h"

#include <cairo-pdf.h>
#include <fcntl.h>
#include <hb-glib.h>
#include <hb-ot.h>
#include <hb.h>
#include <pango/pangocairo.h>
#include <stdlib.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cmath>
#include <cstdio>
#include <cstring>
#include <map>
#include <memory>
#include <optional>
#include <tuple>
#include <unordered_map>
#include <vector>

#include "common/diskfull.h"
#include "engine/engine.h"
#include "output/outputinternal.h"
#include "output/picture.h"
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

using FontOptionsPtr = std::unique_ptr<cairo_font_options_t,
                                       Deleter<cairo_font_options_t, cairo_font_options_destroy>>;
using LayoutIterPtr =
    std::unique_ptr<PangoLayoutIter, Deleter<PangoLayoutIter, pango_layout_iter_free>>;
using MetricsPtr =
    std::unique_ptr<PangoFontMetrics, Deleter<PangoFontMetrics, pango_font_metrics_unref>>;
void FreeChars(gchar* p) {
  g_free(p);
}
using CharsPtr = std::unique_ptr<gchar, Deleter<gchar, FreeChars>>;

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

// Text safe for a single line: valid UTF-8, line breaks and tabs as blanks.
std::string OneLine(std::string text) {
  if (!g_utf8_validate(text.data(), static_cast<gssize>(text.size()), nullptr)) {
    const CharsPtr valid(g_utf8_make_valid(text.data(), static_cast<gssize>(text.size())));
    text = valid.get();
  }
  for (char& c : text) {
    if (c == '\r' || c == '\n' || c == '\t' || c == '\0') c = ' ';
  }
  return text;
}

// A line as the sheet's browser shows it: no blanks at either end, and every run of blanks
// one blank.
std::string CollapseBlanks(const std::string& text) {
  std::string out;
  out.reserve(text.size());
  for (char c : text) {
    if (c == ' ' && (out.empty() || out.back() == ' ')) continue;
    out += c;
  }
  if (!out.empty() && out.back() == ' ') out.pop_back();
  return out;
}

// Whether the last character of `text` with a direction of its own reads left to right.
bool EndsLeftToRight(std::string_view text) {
  bool ltr = false;
  for (const char* p = text.data(); p < text.data() + text.size(); p = g_utf8_next_char(p)) {
    const gunichar c = g_utf8_get_char(p);
    switch (g_unichar_get_script(c)) {
      case G_UNICODE_SCRIPT_HEBREW:
      case G_UNICODE_SCRIPT_ARABIC:
      case G_UNICODE_SCRIPT_SYRIAC:
      case G_UNICODE_SCRIPT_THAANA:
        ltr = false;
        break;
      default:
        if (g_unichar_isalpha(c)) ltr = true;
    }
  }
  return ltr;
}

// The ellipsis that ends a shortened line where its reading ends: after a left-to-right
// word a left-to-right mark keeps it on that word's right.
std::string EllipsisAfter(std::string_view kept) {
  return EndsLeftToRight(kept) ? "…\u200E" : "…";
}

// ---- Shaped lines -----------------------------------------------------------------------
//
// A line is shaped once (pango: HarfBuzz shapes, fribidi orders) and kept as its glyph runs
// left to right, every cluster naming the characters it shows in reading order: a reader
// that turns right-to-left words back into reading order then gets the text exactly,
// mirrored brackets included. Lines that differ only in their digits ("03-5551234",
// "כהן ובניו 17") share one shaping when the font's shaping never touches a digit: each
// digit is then one glyph of its own advance wherever it stands, so another line of the
// same pattern is the same glyphs with other digits.

using ScaledFontPtr =
    std::unique_ptr<cairo_scaled_font_t, Deleter<cairo_scaled_font_t, cairo_scaled_font_destroy>>;
using HbSetPtr = std::unique_ptr<hb_set_t, Deleter<hb_set_t, hb_set_destroy>>;
using HbBlobPtr = std::unique_ptr<hb_blob_t, Deleter<hb_blob_t, hb_blob_destroy>>;
using HbPlanPtr = std::unique_ptr<hb_shape_plan_t, Deleter<hb_shape_plan_t, hb_shape_plan_destroy>>;
using GlyphStringPtr =
    std::unique_ptr<PangoGlyphString, Deleter<PangoGlyphString, pango_glyph_string_free>>;

double Points(int pangoUnits) {
  return pangoUnits / double(PANGO_SCALE);
}

// The ten digits' glyphs and advances in one font and shaping, and whether that shaping
// leaves them alone: no lookup of its plan reads or writes a digit's glyph, and the font
// has no table that kerns or substitutes outside those lookups.
struct DigitGlyphs {
  ObjectPtr font;  // held, so that no other font takes its address as a key
  bool inert = false;
  std::array<PangoGlyph, 10> glyph{};
  std::array<int, 10> advance{};  // pango units
};

bool DigitsUntouched(PangoFont* font, const PangoAnalysis& a, const DigitGlyphs& d) {
  hb_font_t* hb = pango_font_get_hb_font(font);
  if (hb == nullptr) return false;
  hb_face_t* face = hb_font_get_face(hb);
  for (const char* tag : {"kern", "kerx", "morx", "mort", "trak"}) {
    const HbBlobPtr table(hb_face_reference_table(face, hb_tag_from_string(tag, 4)));
    if (hb_blob_get_length(table.get()) > 0) return false;
  }
  hb_segment_properties_t props = HB_SEGMENT_PROPERTIES_DEFAULT;
  props.direction = a.level % 2 == 1 ? HB_DIRECTION_RTL : HB_DIRECTION_LTR;
  props.script = hb_glib_script_to_script(static_cast<GUnicodeScript>(a.script));
  props.language = hb_language_from_string(pango_language_to_string(a.language), -1);
  const HbPlanPtr plan(hb_shape_plan_create_cached(face, &props, nullptr, 0, nullptr));
  for (const hb_tag_t table : {HB_OT_TAG_GSUB, HB_OT_TAG_GPOS}) {
    const HbSetPtr lookups(hb_set_create());
    hb_ot_shape_plan_collect_lookups(plan.get(), table, lookups.get());
    for (hb_codepoint_t l = HB_SET_VALUE_INVALID; hb_set_next(lookups.get(), &l);) {
      const HbSetPtr before(hb_set_create()), input(hb_set_create()), after(hb_set_create()),
          output(hb_set_create());
      hb_ot_layout_lookup_collect_glyphs(face, table, l, before.get(), input.get(), after.get(),
                                         output.get());
      for (const PangoGlyph g : d.glyph) {
        for (const hb_set_t* s : {before.get(), input.get(), after.get(), output.get()})
          if (hb_set_has(s, g)) return false;
      }
    }
  }
  return true;
}

// One glyph run of a shaped line.
struct ShapedRun {
  ObjectPtr pangoFont;        // keeps `font` alive
  cairo_scaled_font_t* font;  // null when the run has no font to draw with
  int x = 0;                  // its left edge from the line's, pango units
  struct Glyph {
    PangoGlyph index;
    int advance, dx, dy;  // pango units
  };
  std::vector<Glyph> glyphs;  // left to right
  std::vector<cairo_text_cluster_t> clusters;
  std::string text;  // the clusters' characters, cluster by cluster in glyph order
  // Digits that another line of the pattern may change: the glyph, where its character
  // stands in `text` and in the line's text.
  struct Digit {
    uint32_t glyph, textAt, lineAt;
  };
  std::vector<Digit> digits;
  const DigitGlyphs* digitGlyphs = nullptr;
};

struct ShapedLine {
  std::string text;                                      // what was shaped
  int width = 0, height = 0, baseline = 0;               // pango units
  double underlinePosition = 0, underlineThickness = 0;  // points, of the first run's font
  bool digitsSwappable = true;  // every digit is in a run whose font leaves digits alone
  std::vector<ShapedRun> runs;  // left to right
};

// The shaping of one text size and style: a pango context set for exact measures (no
// hinting, no rounding, right to left) and the digits of every font and shaping it met.
class TextSetter {
 public:
  TextSetter() {
    fontMap_.reset(pango_cairo_font_map_new());
    context_.reset(pango_font_map_create_context(static_cast<PangoFontMap*>(fontMap_.get())));
    PangoContext* ctx = context();
    pango_cairo_context_set_resolution(ctx, 72);
    FontOptionsPtr options(cairo_font_options_create());
    cairo_font_options_set_hint_metrics(options.get(), CAIRO_HINT_METRICS_OFF);
    cairo_font_options_set_hint_style(options.get(), CAIRO_HINT_STYLE_NONE);
    cairo_font_options_set_antialias(options.get(), CAIRO_ANTIALIAS_GRAY);
    pango_cairo_context_set_font_options(ctx, options.get());
    pango_context_set_round_glyph_positions(ctx, FALSE);
    pango_context_set_base_dir(ctx, PANGO_DIRECTION_RTL);
    desc_.reset(pango_font_description_new());
    layout_.reset(pango_layout_new(ctx));
    pango_layout_set_auto_dir(Layout(), FALSE);
    pango_layout_set_single_paragraph_mode(Layout(), TRUE);
  }

  // `text` (one line of valid UTF-8) in `style` at `size` points.
  ShapedLine Shape(const LineStyle& style, double size, const std::string& text) {
    SetLayout(style, size, text);
    return FromLayout(Layout());
  }

  // The width in points of `text` in `style` at `size`, for fitting.
  double Width(const LineStyle& style, double size, const std::string& text) {
    SetLayout(style, size, text);
    PangoRectangle logical;
    pango_layout_get_extents(Layout(), nullptr, &logical);
    return Points(logical.width);
  }

 private:
  PangoContext* context() { return static_cast<PangoContext*>(context_.get()); }
  PangoLayout* Layout() { return static_cast<PangoLayout*>(layout_.get()); }

  void SetLayout(const LineStyle& style, double size, const std::string& text) {
    pango_font_description_set_family_static(desc_.get(), style.family);
    pango_font_description_set_weight(desc_.get(), style.weight);
    pango_font_description_set_style(desc_.get(), style.slant);
    pango_font_description_set_size(desc_.get(), static_cast<int>(size * PANGO_SCALE + 0.5));
    pango_layout_set_font_description(Layout(), desc_.get());
    pango_layout_set_text(Layout(), text.data(), static_cast<int>(text.size()));
  }

  ShapedLine FromLayout(PangoLayout* layout) {
    ShapedLine line;
    line.text = pango_layout_get_text(layout);
    PangoRectangle logical;
    pango_layout_get_extents(layout, nullptr, &logical);
    line.width = logical.width;
    line.height = logical.height;
    LayoutIterPtr it(pango_layout_get_iter(layout));
    line.baseline = pango_layout_iter_get_baseline(it.get());
    do {
      const PangoLayoutRun* run = pango_layout_iter_get_run_readonly(it.get());
      if (run == nullptr) continue;
      PangoRectangle runLogical;
      pango_layout_iter_get_run_extents(it.get(), nullptr, &runLogical);
      AddRun(line, run, runLogical.x);
    } while (pango_layout_iter_next_run(it.get()));
    // A digit that is not a cluster of its own (one with a mark on it) cannot be swapped.
    size_t slots = 0;
    for (const ShapedRun& run : line.runs) slots += run.digits.size();
    if (slots != static_cast<size_t>(std::count_if(line.text.begin(), line.text.end(),
                                                   [](char c) { return c >= '0' && c <= '9'; })))
      line.digitsSwappable = false;
    if (!line.runs.empty() && line.runs[0].pangoFont) {
      const MetricsPtr m(
          pango_font_get_metrics(static_cast<PangoFont*>(line.runs[0].pangoFont.get()), nullptr));
      line.underlinePosition = Points(pango_font_metrics_get_underline_position(m.get()));
      line.underlineThickness =
          std::max(0.25, Points(pango_font_metrics_get_underline_thickness(m.get())));
    }
    return line;
  }

  void AddRun(ShapedLine& line, const PangoGlyphItem* run, int x) {
    const PangoItem* item = run->item;
    const PangoGlyphString* gs = run->glyphs;
    ShapedRun out;
    out.x = x;
    out.font = nullptr;
    if (item->analysis.font != nullptr) {
      out.pangoFont.reset(g_object_ref(item->analysis.font));
      cairo_scaled_font_t* font =
          pango_cairo_font_get_scaled_font(reinterpret_cast<PangoCairoFont*>(item->analysis.font));
      if (font != nullptr && cairo_scaled_font_status(font) == CAIRO_STATUS_SUCCESS)
        out.font = font;
    }
    const char* text = line.text.data() + item->offset;
    // The byte where each cluster's text ends: the next cluster's start in reading order.
    starts_.assign(gs->log_clusters, gs->log_clusters + gs->num_glyphs);
    std::sort(starts_.begin(), starts_.end());
    starts_.erase(std::unique(starts_.begin(), starts_.end()), starts_.end());
    int i = 0;
    while (i < gs->num_glyphs) {
      const int start = gs->log_clusters[i];
      int count = 0;
      for (; i < gs->num_glyphs && gs->log_clusters[i] == start; ++i) {
        const PangoGlyphInfo& g = gs->glyphs[i];
        if ((g.glyph & PANGO_GLYPH_UNKNOWN_FLAG) == 0 && g.glyph != PANGO_GLYPH_EMPTY) {
          out.glyphs.push_back(
              {g.glyph, g.geometry.width, g.geometry.x_offset, g.geometry.y_offset});
          ++count;
        } else if (!out.glyphs.empty()) {
          // Nothing drawn: its advance goes to the pen before the next glyph.
          out.glyphs.back().advance += g.geometry.width;
        } else {
          out.x += g.geometry.width;
        }
      }
      const auto next = std::upper_bound(starts_.begin(), starts_.end(), start);
      const int end = next == starts_.end() ? item->length : *next;
      if (end <= start && count == 0) continue;
      if (count == 1 && end - start == 1 && text[start] >= '0' && text[start] <= '9') {
        out.digits.push_back({static_cast<uint32_t>(out.glyphs.size() - 1),
                              static_cast<uint32_t>(out.text.size()),
                              static_cast<uint32_t>(item->offset + start)});
      }
      out.text.append(text + start, end - start);
      out.clusters.push_back({end - start, count});
    }
    if (!out.digits.empty()) {
      out.digitGlyphs = DigitsOf(item->analysis);
      if (out.digitGlyphs == nullptr || !out.digitGlyphs->inert) line.digitsSwappable = false;
    }
    line.runs.push_back(std::move(out));
  }

  // The digits of the font and shaping of `a`, worked out once.
  const DigitGlyphs* DigitsOf(const PangoAnalysis& a) {
    if (a.font == nullptr) return nullptr;
    const DigitKey key{a.font, a.script, a.level % 2, a.language};
    auto it = digits_.find(key);
    if (it != digits_.end()) return &it->second;
    DigitGlyphs d;
    const GlyphStringPtr gs(pango_glyph_string_new());
    bool single = true;
    for (int n = 0; n < 10; ++n) {
      const char c = static_cast<char>('0' + n);
      pango_shape_with_flags(&c, 1, &c, 1, &a, gs.get(), PANGO_SHAPE_NONE);
      if (gs->num_glyphs != 1 || gs->glyphs[0].geometry.x_offset != 0 ||
          gs->glyphs[0].geometry.y_offset != 0 ||
          (gs->glyphs[0].glyph & PANGO_GLYPH_UNKNOWN_FLAG)) {
        single = false;
        break;
      }
      d.glyph[n] = gs->glyphs[0].glyph;
      d.advance[n] = gs->glyphs[0].geometry.width;
    }
    d.inert = single && DigitsUntouched(a.font, a, d);
    d.font.reset(g_object_ref(a.font));
    return &digits_.emplace(key, std::move(d)).first->second;
  }

  struct DigitKey {
    PangoFont* font;
    int script, odd;
    PangoLanguage* language;
    bool operator<(const DigitKey& o) const {
      return std::tie(font, script, odd, language) < std::tie(o.font, o.script, o.odd, o.language);
    }
  };

  ObjectPtr fontMap_, context_, layout_;
  FontDescPtr desc_;
  std::vector<int> starts_;
  std::map<DigitKey, DigitGlyphs> digits_;
};

// The width of `line` drawn with the digits of `text` (a text of its pattern).
int WidthWith(const ShapedLine& line, std::string_view text) {
  int width = line.width;
  if (text == line.text) return width;
  for (const ShapedRun& run : line.runs) {
    for (const ShapedRun::Digit& d : run.digits) {
      width += run.digitGlyphs->advance[text[d.lineAt] - '0'] -
               run.digitGlyphs->advance[line.text[d.lineAt] - '0'];
    }
  }
  return width;
}

// The glyphs of a page, gathered by font and drawn with one call for each: a page of labels
// is a few calls instead of one for every run of every line.
class GlyphBatch {
 public:
  // Adds `line` with its logical box's top-left corner at (x, top), in points, showing the
  // digits of `text`, a text of its pattern.
  void Add(const ShapedLine& line, std::string_view text, double x, double top) {
    const bool swap = text != line.text;
    const double baseline = top + Points(line.baseline);
    int shift = 0;  // how far earlier runs' other digits moved this one
    for (const ShapedRun& run : line.runs) {
      if (run.font == nullptr) continue;
      Pending& p = Of(run.font);
      const size_t firstText = p.text.size();
      int pen = run.x + shift;
      size_t nextDigit = 0;
      for (size_t g = 0; g < run.glyphs.size(); ++g) {
        const ShapedRun::Glyph& glyph = run.glyphs[g];
        PangoGlyph index = glyph.index;
        int advance = glyph.advance;
        if (swap && nextDigit < run.digits.size() && run.digits[nextDigit].glyph == g) {
          const uint32_t at = run.digits[nextDigit++].lineAt;
          const int n = text[at] - '0', was = line.text[at] - '0';
          index = run.digitGlyphs->glyph[n];
          const int delta = run.digitGlyphs->advance[n] - run.digitGlyphs->advance[was];
          advance += delta;
          shift += delta;
        }
        p.glyphs.push_back({index, x + Points(pen + glyph.dx), baseline + Points(glyph.dy)});
        pen += advance;
      }
      p.clusters.insert(p.clusters.end(), run.clusters.begin(), run.clusters.end());
      p.text += run.text;
      if (swap) {
        for (const ShapedRun::Digit& d : run.digits) p.text[firstText + d.textAt] = text[d.lineAt];
      }
    }
  }

  // Draws what was gathered, in black.
  void Flush(cairo_t* cr) {
    cairo_set_source_rgb(cr, 0, 0, 0);
    for (Pending& p : pending_) {
      if (p.glyphs.empty()) continue;
      cairo_set_scaled_font(cr, p.font.get());
      cairo_show_text_glyphs(cr, p.text.data(), static_cast<int>(p.text.size()), p.glyphs.data(),
                             static_cast<int>(p.glyphs.size()), p.clusters.data(),
                             static_cast<int>(p.clusters.size()),
                             static_cast<cairo_text_cluster_flags_t>(0));
      p.glyphs.clear();
      p.clusters.clear();
      p.text.clear();
    }
  }

 private:
  struct Pending {
    ScaledFontPtr font;
    std::vector<cairo_glyph_t> glyphs;
    std::vector<cairo_text_cluster_t> clusters;
    std::string text;
  };

  Pending& Of(cairo_scaled_font_t* font) {
    for (Pending& p : pending_) {
      if (p.font.get() == font) return p;
    }
    pending_.push_back({ScaledFontPtr(cairo_scaled_font_reference(font)), {}, {}, {}});
    return pending_.back();
  }

  std::vector<Pending> pending_;  // a handful of fonts a page
};

// Draws a line now, with an underline when asked: for the calibration page and the like.
void DrawLine(cairo_t* cr, GlyphBatch& batch, const ShapedLine& line, double x, double top,
              bool underline) {
  batch.Add(line, line.text, x, top);
  batch.Flush(cr);
  if (underline) {
    cairo_rectangle(cr, x, top + Points(line.baseline) - line.underlinePosition, Points(line.width),
                    line.underlineThickness);
    cairo_fill(cr);
  }
}

// ---- Pictures -----------------------------------------------------------------------

struct Picture {
  output_internal::SurfacePtr surface;
  double width = 0, height = 0;  // points, at 96 pixels to the inch, as a browser shows it
};

// ---- One label ------------------------------------------------------------------------

// What goes on a label, top to bottom.
struct LabelItem {
  int picture = -1;  // 0 top, 1 bottom; -1 for a text line
  int style = 0;     // the line's appearance settings, 0..7
  std::string text;
};

class LabelPainter {
 public:
  LabelPainter(const LabelSettings& labels, std::array<std::optional<Picture>, 2>& pictures,
               GlyphBatch& batch)
      : pictures_(pictures), batch_(batch) {
    for (int i = 0; i < 8; ++i) styles_[i] = LineStyle::Of(labels.LabelDefs[i]);
  }

  // Draws `items` inside `box` (points); the text goes to the batch. Returns false when some
  // did not fit.
  bool Paint(cairo_t* cr, const std::vector<LabelItem>& items, double bx, double by, double bw,
             double bh, double padding) {
    const double x0 = bx + padding, top = by + padding;
    const double width = bw - 2 * padding, height = bh - 2 * padding;
    if (cache_.size() >= kCachedLines) cache_.clear();
    if (own_.size() < items.size()) own_.resize(items.size());
    natural_.assign(items.size(), nullptr);
    naturalWidths_.assign(items.size(), 0);
    sizes_.assign(items.size(), 0);
    heights_.assign(items.size(), 0);
    double total = 0;
    for (size_t i = 0; i < items.size(); ++i) {
      const LabelItem& item = items[i];
      if (item.picture >= 0) {
        const Picture& p = *pictures_[item.picture];
        heights_[i] = p.height * std::min(1.0, width / p.width);
      } else {
        const LineStyle& s = styles_[item.style];
        const ShapedLine& n = *(natural_[i] = Natural(item, i));
        const double natural = naturalWidths_[i] = Points(WidthWith(n, item.text));
        double size = s.size;
        // Width scales with the size: shrink a wide line to fit, not below the minimum.
        if (natural > width) size = std::max(kMinLabelPointSize, s.size * width / natural * 0.999);
        sizes_[i] = size;
        heights_[i] = Points(n.height) * size / s.size;
      }
      total += heights_[i];
    }
    // Too tall together: every line shrinks alike.
    double factor = 1;
    if (total > height) factor = height / total;

    double y = top;
    cairo_set_source_rgb(cr, 0, 0, 0);
    for (size_t i = 0; i < items.size(); ++i) {
      const LabelItem& item = items[i];
      if (item.picture >= 0) {
        const Picture& p = *pictures_[item.picture];
        const double scale = std::min(1.0, width / p.width) * factor;
        const double h = p.height * scale, w = p.width * scale;
        if (y + h > top + height + 0.01) return false;
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
      const ShapedLine* line = natural_[i];
      std::string_view text = item.text;
      if (size != s.size || naturalWidths_[i] > width) {
        scratch_ = setter_.Shape(s, size, item.text);
        if (Points(scratch_.width) > width) scratch_ = Ellipsized(s, size, item.text, width);
        line = &scratch_;
        text = scratch_.text;
      }
      const double h = Points(line->height);
      if (y + h > top + height + 0.01) return false;
      const double w = Points(WidthWith(*line, text));
      batch_.Add(*line, text, x0 + width - w, y);
      if (s.underline) {
        cairo_rectangle(cr, x0 + width - w, y + Points(line->baseline) - line->underlinePosition, w,
                        line->underlineThickness);
        cairo_fill(cr);
      }
      y += h;
    }
    return true;
  }

 private:
  // Lines kept shaped at their own size, by pattern: the fixed word, cities, contacts and the
  // like repeat from label to label, and most of the rest differ only in their digits.
  static constexpr size_t kCachedLines = 16384;

  // The item's line at its style's own size: the shaping of its pattern when the digits of
  // that shaping can be swapped, else its own.
  const ShapedLine* Natural(const LabelItem& item, size_t i) {
    key_.assign(1, static_cast<char>('0' + item.style));
    for (char c : item.text) key_ += c >= '0' && c <= '9' ? '0' : c;
    const LineStyle& s = styles_[item.style];
    auto it = cache_.find(key_);
    if (it == cache_.end()) it = cache_.emplace(key_, setter_.Shape(s, s.size, item.text)).first;
    if (it->second.text == item.text || it->second.digitsSwappable) return &it->second;
    own_[i] = setter_.Shape(s, s.size, item.text);
    return &own_[i];
  }

  // The longest beginning of `text` that fits `width` with an ellipsis after it.
  ShapedLine Ellipsized(const LineStyle& s, double size, const std::string& text, double width) {
    std::vector<size_t> cuts;  // byte offsets of character boundaries, in order
    for (const char* p = text.data(); p < text.data() + text.size(); p = g_utf8_next_char(p)) {
      cuts.push_back(static_cast<size_t>(p - text.data()));
    }
    auto candidate = [&](size_t n) {
      std::string t = text.substr(0, n == cuts.size() ? text.size() : cuts[n]);
      while (!t.empty() && t.back() == ' ') t.pop_back();
      return t + EllipsisAfter(t);
    };
    size_t lo = 0, hi = cuts.size();  // candidate(lo) fits or lo is 0
    while (lo < hi) {
      const size_t mid = (lo + hi + 1) / 2;
      if (setter_.Width(s, size, candidate(mid)) <= width) {
        lo = mid;
      } else {
        hi = mid - 1;
      }
    }
    return setter_.Shape(s, size, candidate(lo));
  }

  std::array<std::optional<Picture>, 2>& pictures_;
  GlyphBatch& batch_;
  std::array<LineStyle, 8> styles_;
  TextSetter setter_;
  std::unordered_map<std::string, ShapedLine> cache_;
  std::string key_;
  std::vector<ShapedLine> own_;  // lines of this label shaped for themselves
  ShapedLine scratch_;
  std::vector<const ShapedLine*> natural_;
  std::vector<double> naturalWidths_, sizes_, heights_;
};

// A field's text on a label, as the sheet shows it; a Null field is an empty line that
// keeps its place.
std::string FieldText(const db::Value& v) {
  std::string out;
  output_internal::AppendValueText(v, out);
  return CollapseBlanks(OneLine(std::move(out)));
}

// The account key as the sheet spreads it into right-to-left cells: its characters as
// kept, the first on the right, each run of blanks one blank. The load keeps the key in
// the host's order, reversed, so the override lays it out exactly as the host shows it
// (10007 is kept as 70001).
std::string KeyText(const db::Value& v) {
  std::string text, out = "\u202E";
  output_internal::AppendValueText(v, text);
  for (char c : OneLine(std::move(text))) {
    if (c == ' ' && out.back() == ' ') continue;
    out += c;
  }
  return out + "\u202C";
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
    // Joined with blanks, which the sheet shows as one; an empty city leaves the zip alone.
    line(5, CollapseBlanks(FieldText(rs.Field(f.city)) + " " + FieldText(rs.Field(f.zip))));
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

// Everything after this is drawn in the stock's millimetres turned to points, corrected
// for the printer as StockOffset says.
void ApplyCorrection(cairo_t* cr, StockOffset c) {
  cairo_identity_matrix(cr);
  cairo_translate(cr, Pt(c.x), Pt(c.y));
  cairo_scale(cr, 1 + c.scaleX / 1000, 1 + c.scaleY / 1000);
}

// ---- The calibration page -------------------------------------------------------------

void Line(cairo_t* cr, double x1, double y1, double x2, double y2) {
  cairo_move_to(cr, Pt(x1), Pt(y1));
  cairo_line_to(cr, Pt(x2), Pt(y2));
}

// Short texts of the calibration page, in millimetres.
class PageWriter {
 public:
  explicit PageWriter(cairo_t* cr) : cr_(cr) {}

  // `text` at `size` points, its box's horizontal `align` (0 its left edge, 0.5 its middle,
  // 1 its right edge) at xMm and its middle at yMm. Returns its width and height in mm.
  std::pair<double, double> Put(const std::string& text, double size, double xMm, double yMm,
                                double align, bool bold = false) {
    LineStyle s;
    if (bold) s.weight = PANGO_WEIGHT_BOLD;
    const ShapedLine line = setter_.Shape(s, size, text);
    const double w = Points(line.width), h = Points(line.height);
    DrawLine(cr_, batch_, line, Pt(xMm) - w * align, Pt(yMm) - h / 2, false);
    return {w / kPtPerMm, h / kPtPerMm};
  }

  // A figure, isolated left to right so that a minus stays before its digits.
  void Figure(const std::string& text, double size, double xMm, double yMm, double align) {
    Put("\u2066" + text + "\u2069", size, xMm, yMm, align);
  }

  double WidthMm(const std::string& text, double size) {
    return setter_.Width(LineStyle{}, size, text) / kPtPerMm;
  }

  // `text` broken at blanks into lines no wider than `widthMm`.
  std::vector<std::string> Wrap(const std::string& text, double size, double widthMm) {
    std::vector<std::string> lines;
    std::string line;
    size_t from = 0;
    while (from <= text.size()) {
      size_t blank = text.find(' ', from);
      if (blank == std::string::npos) blank = text.size();
      const std::string word = text.substr(from, blank - from);
      const std::string longer = line.empty() ? word : line + " " + word;
      if (!line.empty() && WidthMm(longer, size) > widthMm) {
        lines.push_back(line);
        line = word;
      } else {
        line = longer;
      }
      from = blank + 1;
    }
    if (!line.empty()) lines.push_back(line);
    return lines;
  }

 private:
  cairo_t* cr_;
  TextSetter setter_;
  GlyphBatch batch_;
};

// The scales' figures, names and instruction, in points; the figures are large enough to
// read against the light.
constexpr double kScaleFigurePt = 7.5;
constexpr double kScaleNamePt = 8;
constexpr double kInstructionPt = 8.5;
constexpr double kScaleReachMm = 10;  // each scale runs from -10 to +10 mm

// The area a scale takes, kept clear of the label outlines.
struct Area {
  double x, y, w, h;
};

// A horizontal scale across the vertical edge at x, at height y: ticks below the line, the
// figures under them, the name above (moved in from the paper's edge when it would leave it).
Area HorizontalScale(cairo_t* cr, PageWriter& text, const std::string& name, double x, double y,
                     double pageWidth) {
  cairo_set_line_width(cr, 0.3);
  Line(cr, x - kScaleReachMm, y, x + kScaleReachMm, y);
  for (int t = -10; t <= 10; ++t) {
    const double len = t == 0 ? 4 : t % 5 == 0 ? 3 : 1.8;
    Line(cr, x + t, t == 0 ? y - 1.5 : y, x + t, y + len);
  }
  cairo_stroke(cr);
  for (int t = -10; t <= 10; t += 5)
    text.Figure(std::to_string(t), kScaleFigurePt, x + t, y + 6, 0.5);
  const double half = text.WidthMm(name, kScaleNamePt) / 2 + 1;
  text.Put(name, kScaleNamePt,
           std::clamp(x, half + kCalibrationEdgeMm, pageWidth - half - kCalibrationEdgeMm), y - 3.5,
           0.5, true);
  return {x - kScaleReachMm - 2.5, y - 6, 2 * kScaleReachMm + 5, 14.5};
}

// A vertical scale across the horizontal edge at y, at x: ticks right of the line, the
// figures right of them, the name to the left (or right of the figures, near the paper's
// left edge).
Area VerticalScale(cairo_t* cr, PageWriter& text, const std::string& name, double x, double y) {
  cairo_set_line_width(cr, 0.3);
  Line(cr, x, y - kScaleReachMm, x, y + kScaleReachMm);
  for (int t = -10; t <= 10; ++t) {
    const double len = t == 0 ? 4 : t % 5 == 0 ? 3 : 1.8;
    Line(cr, t == 0 ? x - 1.5 : x, y + t, x + len, y + t);
  }
  cairo_stroke(cr);
  for (int t = -10; t <= 10; t += 5)
    text.Figure(std::to_string(t), kScaleFigurePt, x + 5, y + t, 0);
  const double nameWidth = text.WidthMm(name, kScaleNamePt);
  if (x - 2.5 - nameWidth >= kCalibrationEdgeMm) {
    text.Put(name, kScaleNamePt, x - 2.5, y, 1, true);
    return {x - 3.5 - nameWidth, y - kScaleReachMm - 2, nameWidth + 13, 2 * kScaleReachMm + 4};
  }
  text.Put(name, kScaleNamePt, x + 12, y, 0, true);
  return {x - 2, y - kScaleReachMm - 2, nameWidth + 16, 2 * kScaleReachMm + 4};
}

// The numbered instruction, in the middle of the page on a white ground, no wider than
// leaves the page's side scales clear.
void Instruction(cairo_t* cr, PageWriter& text, const LabelStock& stock, StockOffset offset) {
  const std::string box = "\"מדבקות על גיליון (PDF)\"";
  const std::vector<std::string> paragraphs = {
      "דף כיול לתבנית \u2066" + stock.id + "\u2069",
      "תיקון נוכחי: היסט אופקי \u2066" + FormatMm(offset.x) + "\u2069 מ\"מ, אנכי \u2066" +
          FormatMm(offset.y) + "\u2069 מ\"מ; קנה מידה אופקי \u2066" + FormatMm(offset.scaleX) +
          "\u2069‰, אנכי \u2066" + FormatMm(offset.scaleY) + "\u2069‰",
      "1. הדפיסו דף זה על נייר רגיל בגודל מלא (100%, בלי \"התאמה לדף\").",
      "2. הניחו אותו על גיליון מדבקות ריק, יישרו את הקצוות של שני הדפים והחזיקו מול האור.",
      "3. בכל אחד מארבעת הסרגלים (\"אופקי 1\" ו\"אנכי 1\" במדבקה הראשונה למעלה מימין, "
      "\"אופקי 2\" ו\"אנכי 2\" במדבקה האחרונה למטה משמאל) קראו את המספר שעליו נופל קו "
      "החיתוך של המדבקה בגיליון: בסרגל אופקי הקו העומד, בסרגל אנכי הקו השוכב. קו מימין "
      "לאפס או מתחתיו: מספר חיובי; משמאל לאפס או מעליו: שלילי.",
      "4. בחלון \"הגדרות צורה וגודל\" (הכפתור \"הגדרות מדבקה\"), בחלק " + box +
          ", בחרו את התבנית, הקלידו כל קריאה בתיבה בשם הסרגל ולחצו \"חשב תיקון\"; ההיסט וקנה "
          "המידה מתעדכנים. אשרו את החלון.",
      "5. הדפיסו דף כיול נוסף לבדיקה: כל הקריאות צריכות להיות 0.",
  };
  const double width = std::min(150.0, stock.pageWidth - 56);
  std::vector<std::pair<std::string, bool>> lines;
  for (size_t i = 0; i < paragraphs.size(); ++i) {
    for (const std::string& l : text.Wrap(paragraphs[i], kInstructionPt, width))
      lines.emplace_back(l, i == 0);
  }
  constexpr double kLineMm = 4.2;
  const double height = lines.size() * kLineMm;
  const double right = stock.pageWidth / 2 + width / 2;
  double y = stock.pageHeight / 2 - height / 2;
  cairo_set_source_rgb(cr, 1, 1, 1);
  cairo_rectangle(cr, Pt(right - width - 3), Pt(y - 3), Pt(width + 6), Pt(height + 6));
  cairo_fill(cr);
  cairo_set_source_rgb(cr, 0, 0, 0);
  for (const auto& [line, bold] : lines) {
    text.Put(line, kInstructionPt, right, y + kLineMm / 2, 1, bold);
    y += kLineMm;
  }
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
  if (count == 0 || g.copies == 0) {
    throw OutputError(count == 0 ? "אין מדבקות להדפסה: לא נמצאו נמענים"
                                 : "אין מדבקות להדפסה: מספר העותקים הוא 0");
  }
  // Only sheets that hold a label are printed: a start beyond the first sheet skips it.
  const int64_t start = std::max<int64_t>(g.start, 1);
  const int64_t skipped = std::min(start - 1, perPage);
  const int64_t pages = (skipped + count * g.copies + perPage - 1) / perPage;

  std::array<std::optional<Picture>, 2> pictures;
  std::array<bool, 2> havePicture{};
  for (int i = 0; i < 2; ++i) {
    if (!Panel::On(panel.ChkLogo[i])) continue;
    std::string problem;
    output_internal::LabelPicture read =
        output_internal::ReadLabelPicture(labels.LabPics[i], problem);
    if (!read.surface) {
      ui.ShowMessage(problem + "; המדבקות מודפסות בלעדיה", kTitleMessage, MsgIcon::Information);
      continue;
    }
    // 96 pixels to the inch, as a browser shows it.
    pictures[i] = Picture{std::move(read.surface), read.widthPx * 0.75, read.heightPx * 0.75};
    havePicture[i] = true;
  }

  PdfFile file(pFileName, Pt(stock.pageWidth), Pt(stock.pageHeight));
  cairo_t* cr = file.cr();
  ApplyCorrection(cr, offset);
  GlyphBatch batch;
  LabelPainter painter(labels, pictures, batch);
  const LabelFields fields(rs);
  std::vector<LabelItem> items;
  int64_t copy = 0;
  int64_t cut = 0;
  ProgressReporter pageProgress(ui, static_cast<double>(pages));
  for (int64_t page = 1; !rs.AtEnd(); ++page) {
    bool drawn = false;
    for (int position = 1; position <= perPage && !rs.AtEnd(); ++position) {
      if (page == 1 && position < start) continue;
      if (copy == 0) BuildItems(rs, fields, panel, havePicture, items);
      const LabelBox box = StockLabelBox(stock, position);
      if (!painter.Paint(cr, items, Pt(box.x), Pt(box.y), Pt(box.width), Pt(box.height),
                         Pt(stock.padding))) {
        ++cut;
      }
      drawn = true;
      if (++copy == g.copies) {
        copy = 0;
        rs.MoveNext();
      }
    }
    if (!drawn) continue;
    batch.Flush(cr);
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
  ApplyCorrection(cr, offset);
  PageWriter text(cr);
  cairo_set_source_rgb(cr, 0, 0, 0);

  // The four scales: two at the first label (top right), two at the last (bottom left),
  // each across the edge CalibrationMarksOf chose.
  const CalibrationMarks m = CalibrationMarksOf(stock);
  const LabelBox first = StockLabelBox(stock, 1),
                 last = StockLabelBox(stock, stock.LabelsPerPage());
  const Area areas[] = {
      HorizontalScale(cr, text, "אופקי 1", m.x1, first.y + first.height / 2, stock.pageWidth),
      VerticalScale(cr, text, "אנכי 1", first.x + first.width / 2, m.y1),
      HorizontalScale(cr, text, "אופקי 2", m.x2, last.y + last.height / 2, stock.pageWidth),
      VerticalScale(cr, text, "אנכי 2", last.x + last.width / 2, m.y2),
  };

  // Every label's outline with a cross on each corner, kept off the scales.
  cairo_save(cr);
  cairo_rectangle(cr, Pt(-50), Pt(-50), Pt(stock.pageWidth + 100), Pt(stock.pageHeight + 100));
  for (const Area& a : areas) cairo_rectangle(cr, Pt(a.x), Pt(a.y), Pt(a.w), Pt(a.h));
  cairo_set_fill_rule(cr, CAIRO_FILL_RULE_EVEN_ODD);
  cairo_clip(cr);
  cairo_set_line_width(cr, 0.4);
  constexpr double kArm = 3;
  for (int p = 1; p <= stock.LabelsPerPage(); ++p) {
    const LabelBox b = StockLabelBox(stock, p);
    cairo_rectangle(cr, Pt(b.x), Pt(b.y), Pt(b.width), Pt(b.height));
    for (const double cx : {b.x, b.x + b.width}) {
      for (const double cy : {b.y, b.y + b.height}) {
        Line(cr, cx - kArm, cy, cx + kArm, cy);
        Line(cr, cx, cy - kArm, cx, cy + kArm);
      }
    }
  }
  cairo_stroke(cr);
  cairo_restore(cr);

  Instruction(cr, text, stock, offset);
  file.ShowPage();
  file.Commit();
}

}  // namespace zdr

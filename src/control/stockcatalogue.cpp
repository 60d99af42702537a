#include "control/stockcatalogue.h"

#include <expat.h>

#include <algorithm>
#include <charconv>
#include <cmath>
#include <filesystem>
#include <fstream>
#include <map>
#include <memory>
#include <sstream>

namespace zdr {
namespace {

namespace fs = std::filesystem;

// A catalogue file is some hundred kilobytes; anything far larger is not one.
constexpr std::uintmax_t kMaxFileBytes = 16 << 20;
// Text is drawn this far inside a catalogue label when the template gives no margin.
constexpr double kDefaultPaddingMm = 2;

// ---- What a file holds, as written ------------------------------------------------------

struct RawLabel {
  std::string kind;  // "rectangle", "round", "ellipse", "cd"
  std::map<std::string, std::string> attrs;
  std::string margin;                                     // Markup-margin size, when given
  std::vector<std::map<std::string, std::string>> grids;  // Layout elements
};

struct RawTemplate {
  std::map<std::string, std::string> attrs;
  std::vector<RawLabel> labels;

  const std::string& Attr(const char* name) const {
    static const std::string none;
    const auto it = attrs.find(name);
    return it == attrs.end() ? none : it->second;
  }
};

struct Paper {
  double width = 0, height = 0;
};

using Attrs = std::map<std::string, std::string>;

Attrs ReadAttrs(const XML_Char** atts) {
  Attrs out;
  for (int i = 0; atts[i] != nullptr && atts[i + 1] != nullptr; i += 2) out[atts[i]] = atts[i + 1];
  return out;
}

// Gathers the templates and paper sizes of one file. A template enters the list only when
// its closing tag is read, so one cut short by a fault in the file is left out.
class FileReader {
 public:
  FileReader(std::vector<RawTemplate>& templates, std::map<std::string, Paper>& papers)
      : templates_(templates), papers_(papers) {}

  // Parses `text`; returns an empty string or the parser's complaint with its line.
  std::string Parse(const std::string& text) {
    std::unique_ptr<std::remove_pointer_t<XML_Parser>, decltype(&XML_ParserFree)> parser(
        XML_ParserCreate("UTF-8"), &XML_ParserFree);
    if (!parser) return "אין די זיכרון";
    inTemplate_ = false;
    XML_SetUserData(parser.get(), this);
    XML_SetElementHandler(parser.get(), &FileReader::Start, &FileReader::End);
    if (XML_Parse(parser.get(), text.data(), static_cast<int>(text.size()), XML_TRUE) ==
        XML_STATUS_ERROR) {
      return std::string(XML_ErrorString(XML_GetErrorCode(parser.get()))) + ", שורה " +
             std::to_string(XML_GetCurrentLineNumber(parser.get()));
    }
    return "";
  }

 private:
  static void Start(void* self, const XML_Char* name, const XML_Char** atts) {
    static_cast<FileReader*>(self)->OnStart(name, atts);
  }
  static void End(void* self, const XML_Char* name) { static_cast<FileReader*>(self)->OnEnd(name); }

  void OnStart(std::string_view name, const XML_Char** atts) {
    if (name == "Template") {
      open_ = RawTemplate{ReadAttrs(atts), {}};
      inTemplate_ = true;
    } else if (inTemplate_ && name.starts_with("Label-")) {
      open_.labels.push_back({std::string(name.substr(6)), ReadAttrs(atts), "", {}});
    } else if (inTemplate_ && !open_.labels.empty() && name == "Layout") {
      open_.labels.back().grids.push_back(ReadAttrs(atts));
    } else if (inTemplate_ && !open_.labels.empty() && name == "Markup-margin") {
      open_.labels.back().margin = ReadAttrs(atts)["size"];
    } else if (name == "Paper-size") {
      Attrs a = ReadAttrs(atts);
      const auto w = CatalogueLengthMm(a["width"]), h = CatalogueLengthMm(a["height"]);
      if (w && h && !a["id"].empty()) papers_[a["id"]] = {*w, *h};
    }
  }

  void OnEnd(std::string_view name) {
    if (name == "Template" && inTemplate_) {
      templates_.push_back(std::move(open_));
      inTemplate_ = false;
    }
  }

  std::vector<RawTemplate>& templates_;
  std::map<std::string, Paper>& papers_;
  RawTemplate open_;
  bool inTemplate_ = false;
};

std::string ReadFile(const fs::path& path, std::string& problem) {
  std::error_code ec;
  const auto size = fs::file_size(path, ec);
  if (ec || !fs::is_regular_file(path, ec) || size > kMaxFileBytes) {
    problem = "אינו קובץ קטלוג";
    return {};
  }
  std::ifstream in(path, std::ios::binary);
  std::ostringstream text;
  text << in.rdbuf();
  if (!in && !in.eof()) problem = "לא ניתן לקרוא את הקובץ";
  return text.str();
}

// ---- A template as a stock ----------------------------------------------------------------

std::optional<unsigned> Count(const std::string& text) {
  unsigned v = 0;
  const auto [end, ec] = std::from_chars(text.data(), text.data() + text.size(), v);
  if (ec != std::errc() || end != text.data() + text.size()) return std::nullopt;
  return v;
}

const char* ShapeName(const std::string& kind) {
  if (kind == "round") return "מדבקות עגולות";
  if (kind == "ellipse") return "מדבקות אליפטיות";
  if (kind == "cd") return "מדבקות תקליטור";
  return nullptr;
}

class EntryBuilder {
 public:
  EntryBuilder(const std::vector<RawTemplate>& all, const std::map<std::string, Paper>& papers)
      : all_(all), papers_(papers) {
    for (const RawTemplate& t : all_) byId_[IdOf(t)] = &t;
  }

  static std::string IdOf(const RawTemplate& t) { return t.Attr("brand") + " " + t.Attr("part"); }

  CatalogueEntry Build(const RawTemplate& own) {
    CatalogueEntry e;
    e.id = IdOf(own);
    e.description =
        own.Attr("description").empty() ? own.Attr("_description") : own.Attr("description");
    // An equivalent part has the figures of the one it names, of the same brand.
    const RawTemplate* t = &own;
    for (int hops = 0; !t->Attr("equiv").empty(); ++hops) {
      const auto it = byId_.find(t->Attr("brand") + " " + t->Attr("equiv"));
      if (it == byId_.end() || hops == 8) {
        e.problem = "התבנית מפנה לחלק " + t->Attr("equiv") + " שאינו בקטלוג";
        return e;
      }
      t = it->second;
    }
    if (e.description.empty()) e.description = t->Attr("_description");
    std::string problem;
    std::optional<LabelStock> stock = StockOf(*t, e.id, problem);
    if (stock) problem = LabelStockProblem(*stock);
    if (problem.empty()) {
      e.stock = std::move(stock);
    } else {
      e.problem = problem;
    }
    return e;
  }

 private:
  // The figure `name` of `attrs` in millimetres; records the problem when it is missing or
  // not a length. `fallback` is taken when the attribute is missing.
  std::optional<double> Length(const Attrs& attrs, const char* name, std::string& problem,
                               std::optional<double> fallback = std::nullopt) {
    const auto it = attrs.find(name);
    if (it == attrs.end() && fallback) return fallback;
    const auto v = it == attrs.end() ? std::nullopt : CatalogueLengthMm(it->second);
    if (!v && problem.empty()) {
      problem = "מידה חסרה או לא תקינה בתבנית: " + std::string(name) + "=\"" +
                (it == attrs.end() ? "" : it->second) + "\"";
    }
    return v;
  }

  std::optional<LabelStock> StockOf(const RawTemplate& t, const std::string& id,
                                    std::string& problem) {
    if (t.labels.empty()) {
      problem = "בתבנית אין מדבקות";
      return std::nullopt;
    }
    if (t.labels.size() > 1) {
      problem = "בגיליון כמה צורות של מדבקות; ניתן להדפיס רק גיליון של מדבקות זהות";
      return std::nullopt;
    }
    const RawLabel& label = t.labels[0];
    if (const char* shape = ShapeName(label.kind)) {
      problem = std::string(shape) + "; ניתן להדפיס רק מדבקות מלבניות";
      return std::nullopt;
    }
    if (label.kind != "rectangle") {
      problem = "צורת המדבקות \"" + label.kind + "\" אינה מוכרת";
      return std::nullopt;
    }
    if (label.grids.size() != 1) {
      problem = label.grids.empty()
                    ? "בתבנית אין סידור של מדבקות בגיליון"
                    : "המדבקות מסודרות בגיליון ביותר מרשת אחת; ניתן להדפיס רק רשת אחידה";
      return std::nullopt;
    }

    LabelStock s;
    s.id = id;
    s.source = id;
    const std::string& size = t.Attr("size");
    if (size.empty() || size == "Other") {
      const auto w = Length(t.attrs, "width", problem), h = Length(t.attrs, "height", problem);
      if (!w || !h) return std::nullopt;
      s.pageWidth = *w;
      s.pageHeight = *h;
    } else {
      const auto paper = papers_.find(size);
      if (paper == papers_.end()) {
        problem = "גודל הדף \"" + size + "\" אינו מוכר";
        return std::nullopt;
      }
      s.pageWidth = paper->second.width;
      s.pageHeight = paper->second.height;
    }

    const auto w = Length(label.attrs, "width", problem);
    const auto h = Length(label.attrs, "height", problem);
    const auto round = Length(label.attrs, "round", problem, 0.0);
    const Attrs& grid = label.grids[0];
    const auto x0 = Length(grid, "x0", problem, 0.0), y0 = Length(grid, "y0", problem, 0.0);
    const auto dx = Length(grid, "dx", problem, 0.0), dy = Length(grid, "dy", problem, 0.0);
    const auto nx = Count(grid.count("nx") ? grid.at("nx") : "");
    const auto ny = Count(grid.count("ny") ? grid.at("ny") : "");
    if (problem.empty() && (!nx || !ny)) problem = "מספר המדבקות בשורה או בעמודה אינו תקין";
    if (!problem.empty()) return std::nullopt;

    s.labelWidth = *w;
    s.labelHeight = *h;
    s.side = *x0;
    s.top = *y0;
    s.cols = static_cast<int>(std::min<unsigned>(*nx, 1000));
    s.rows = static_cast<int>(std::min<unsigned>(*ny, 1000));
    // One column or row gives no pitch: the label's own size stands for it.
    s.pitchX = s.cols == 1 && *dx == 0 ? *w : *dx;
    s.pitchY = s.rows == 1 && *dy == 0 ? *h : *dy;
    // The template's margin, but clear of a rounded corner and leaving room for text.
    double padding = kDefaultPaddingMm;
    if (!label.margin.empty()) {
      const auto m = CatalogueLengthMm(label.margin);
      if (m && *m >= 0) padding = *m;
    }
    padding = std::max(padding, 0.3 * *round);
    if (2 * padding >= std::min(*w, *h)) padding = std::min(*w, *h) / 4;
    s.padding = padding;
    s.name = StockCaption(s);
    return s;
  }

  const std::vector<RawTemplate>& all_;
  const std::map<std::string, Paper>& papers_;
  std::map<std::string, const RawTemplate*> byId_;
};

}  // namespace

std::optional<double> CatalogueLengthMm(std::string_view text) {
  while (!text.empty() && text.front() == ' ') text.remove_prefix(1);
  while (!text.empty() && text.back() == ' ') text.remove_suffix(1);
  double v = 0;
  const auto [end, ec] = std::from_chars(text.data(), text.data() + text.size(), v);
  if (ec != std::errc() || !std::isfinite(v)) return std::nullopt;
  std::string_view unit(end, text.data() + text.size() - end);
  while (!unit.empty() && unit.front() == ' ') unit.remove_prefix(1);
  double mmPer = 0;
  if (unit.empty() || unit == "pt") {
    mmPer = 25.4 / 72;
  } else if (unit == "in") {
    mmPer = 25.4;
  } else if (unit == "mm") {
    mmPer = 1;
  } else if (unit == "cm") {
    mmPer = 10;
  } else if (unit == "pc") {
    mmPer = 25.4 / 6;
  } else {
    return std::nullopt;
  }
  return v * mmPer;
}

const CatalogueEntry* StockCatalogue::Find(std::string_view id) const {
  for (const CatalogueEntry& e : entries) {
    if (e.id == id) return &e;
  }
  return nullptr;
}

StockCatalogue ReadStockCatalogue(const std::string& folder) {
  StockCatalogue catalogue;
  std::error_code ec;
  if (!fs::is_directory(folder, ec)) return catalogue;
  std::vector<fs::path> files;
  for (const auto& entry : fs::directory_iterator(folder, ec)) {
    const std::string name = entry.path().filename().string();
    if (name.ends_with("-templates.xml")) files.push_back(entry.path());
  }
  std::sort(files.begin(), files.end());
  files.insert(files.begin(), fs::path(folder) / "paper-sizes.xml");

  std::vector<RawTemplate> templates;
  std::map<std::string, Paper> papers;
  FileReader reader(templates, papers);
  for (const fs::path& file : files) {
    std::string problem;
    const std::string text = ReadFile(file, problem);
    if (problem.empty()) problem = reader.Parse(text);
    if (!problem.empty()) {
      catalogue.problems.push_back("קטלוג המדבקות " + file.string() + ": " + problem);
    }
  }
  EntryBuilder builder(templates, papers);
  for (const RawTemplate& t : templates) catalogue.entries.push_back(builder.Build(t));
  return catalogue;
}

const StockCatalogue& InstalledStockCatalogue() {
  static const StockCatalogue catalogue = ReadStockCatalogue(kCatalogueFolder);
  return catalogue;
}

}  // namespace zdr

// The label stocks of the glabels catalogue (Debian's glabels-data package): about 1,700
// sheets by brand and part number, kept as XML templates and read with expat.
//
// A template this system can print becomes a LabelStock whose id is its brand and part,
// "Avery L7160". It must hold one rectangular label in one grid; round, elliptical and CD
// labels, sheets that mix grids, and figures that do not make a sound stock come with the
// reason in Hebrew instead. A template that names another as its equivalent ("equiv") takes
// that one's figures.
#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "common/labelstock.h"

namespace zdr {

struct CatalogueEntry {
  std::string id;           // brand and part, "Avery L7160"
  std::string description;  // the catalogue's own words (English), may be empty
  std::optional<LabelStock> stock;
  std::string problem;  // why it cannot be printed (Hebrew), when `stock` is empty
};

struct StockCatalogue {
  std::vector<CatalogueEntry> entries;  // by brand, then part, as read
  std::vector<std::string> problems;    // files that could not be read, with the reason

  const CatalogueEntry* Find(std::string_view id) const;
};

// Reads every "*-templates.xml" of `folder`, with the paper sizes of its "paper-sizes.xml".
// A file that cannot be read or parsed adds a problem and leaves out the templates it had
// not finished; nothing throws.
StockCatalogue ReadStockCatalogue(const std::string& folder);

// The installed catalogue, read from kCatalogueFolder once per run (empty when glabels-data
// is not installed). Safe to call from several threads.
inline constexpr const char* kCatalogueFolder = "/usr/share/libglabels-3.0/templates";
const StockCatalogue& InstalledStockCatalogue();

// A length of the catalogue in millimetres: a number with the unit pt (the default), in,
// mm, cm or pc. Nothing when it is not one.
std::optional<double> CatalogueLengthMm(std::string_view text);

}  // namespace zdr

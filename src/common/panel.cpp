#include "common/panel.h"

#include <string_view>

namespace zdr {

int TextBoxMaxLength(std::string_view name) {
  if (name.rfind("CutOff", 0) == 0) return 1;
  if (name == "txtFromSort" || name == "txtToSort") return 3;
  if (name == "txtTransType") return 4;
  if (name == "txtRows" || name == "txtCols" || name == "txtCopies" || name == "txtStartFrom")
    return 3;
  if (name == "TxtToCrd" || name == "TxtToDate" || name == "txtToRef" || name == "txtToItmKey" ||
      name == "txtToItmSort" || name == "txtToJournal" || name == "txtToTransDate" ||
      name == "txtToTransVDate")
    return 15;
  return 0;
}

}  // namespace zdr

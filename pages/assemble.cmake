# Run by a build: makes one file of the page's parts, with the two places that a document's writer fills, and the same as
# C++ source.

file(READ "${SOURCES}/page.html" page)
file(READ "${SOURCES}/page.css" style)
set(script "")
foreach(part elements journeys tracks accounts losses device fleet devices start)
  file(READ "${SOURCES}/${part}.js" text)
  string(APPEND script "${text}")
endforeach()
string(REPLACE "@STYLE@" "${style}" page "${page}")
string(REPLACE "@SCRIPT@" "${script}" page "${page}")
file(WRITE "${TARGET}" "${page}")
string(CONFIGURE [[#include <string_view>

namespace host {

extern const std::string_view kPageTemplate = R"page(@page@)page";

}  // namespace host
]] source @ONLY)
file(WRITE "${EMBEDDED}" "${source}")

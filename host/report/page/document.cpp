#include "host/report/page/document.h"

#include "base/text/base64.h"
#include "base/text/sha256.h"
#include "host/report/page/html.h"
#include "host/report/page/style.h"
#include "host/report/page/zoom_script.h"

namespace quazor {

namespace {

std::string hashOf(std::string_view text) { return " 'sha256-" + base64(sha256(text)) + "'"; }

std::string policy(const PlotLibrary* library) {
  std::string text = "default-src 'none'; style-src" + hashOf(pageStyle());
  if (library != nullptr) {
    text += hashOf(library->style) + "; script-src" + hashOf(library->script) + hashOf(zoomScript());
  }
  return text + "; base-uri 'none'; form-action 'none'";
}

}  // namespace

std::string bannerOf(const std::string& kind, const std::string& word, const std::string& device,
                     const std::string& sentence, const std::string& facts) {
  return "<header class=\"" + kind + "\"><div>" +
         element("h1", element("span class=\"word\"", word) +
                           (device.empty() ? device : " " + element("span class=\"device\"", device)) +
                           element("span class=\"sentence\"", sentence)) +
         element("p", facts) + "</div></header>\n";
}

std::string document(const std::string& title, const std::string& body, const PlotLibrary* library) {
  std::string html =
      "<!DOCTYPE html>\n<html lang=\"en\">\n<head>\n<meta charset=\"utf-8\">\n"
      "<meta http-equiv=\"Content-Security-Policy\" content=\"" +
      policy(library) +
      "\">\n<meta name=\"viewport\" content=\"width=device-width, initial-scale=1\">\n"
      "<meta name=\"color-scheme\" content=\"light dark\">\n" +
      element("title", title) + "\n";
  if (library != nullptr) html += element("style", library->style) + "\n";
  html += element("style", pageStyle()) + "\n</head>\n<body>\n" + body;
  if (library != nullptr) html += element("script", library->script) + "\n" + element("script", zoomScript()) + "\n";
  return html + "</body>\n</html>\n";
}

std::string footerOf(const RunStarted& run, const PlotLibrary* library) {
  const std::string made = "Made by quazor " + htmlText(run.program) + ". This file is complete: it loads nothing and ";
  if (library == nullptr) return element("footer", element("p", made + "runs no script.")) + "\n";
  return element("footer", element("p", made + "its only scripts draw the plots.") +
                               element("details", element("summary", "Licence of dygraphs, which draws the plots") +
                                                      element("pre", htmlLines(library->licence)))) +
         "\n";
}

}  // namespace quazor

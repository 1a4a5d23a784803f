#include "host/report/page/document.h"

#include "base/text/base64.h"
#include "base/text/sha256.h"
#include "host/report/page/html.h"
#include "host/report/page/style.h"

namespace quazor {

namespace {

std::string policy() {
  return "default-src 'none'; style-src 'sha256-" + base64(sha256(pageStyle())) +
         "'; base-uri 'none'; form-action 'none'";
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

std::string document(const std::string& title, const std::string& body) {
  return "<!DOCTYPE html>\n<html lang=\"en\">\n<head>\n<meta charset=\"utf-8\">\n"
         "<meta http-equiv=\"Content-Security-Policy\" content=\"" +
         policy() +
         "\">\n<meta name=\"viewport\" content=\"width=device-width, initial-scale=1\">\n"
         "<meta name=\"color-scheme\" content=\"light dark\">\n" +
         element("title", title) + "\n" + element("style", pageStyle()) + "\n</head>\n<body>\n" + body +
         "</body>\n</html>\n";
}

std::string footerOf(const RunStarted& run) {
  return element("footer", element("p", "Made by quazor " + htmlText(run.program) +
                                            ". This file is complete: it loads nothing and runs no script.")) +
         "\n";
}

}  // namespace quazor

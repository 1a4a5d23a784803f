#include "host/testing/plugins/image_experiment.h"

#include <utility>

namespace quazor::fake {

QZDescription ImageExperiment::experimentDescription() const {
  QZDescription description("Gives images.");
  description.addParameter(QZNumberParameter("How many images it gives.", true), "images");
  description.addParameter(QZNumberParameter("How many samples a list has.", false), "samples");
  return description;
}

bool ImageExperiment::setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* /*host*/,
                                          DiagnosticErrorPtr* /*error*/) {
  images_ = toUnsigned(parameters.find("images"));
  samples_ = parameters.contains("samples") ? toSigned(parameters.find("samples")) : 48;
  return true;
}

std::unique_ptr<QZExperimentResult> ImageExperiment::run(DiagnosticErrorPtr* /*error*/) {
  Array images;
  for (std::uint64_t image = 0; image < images_; ++image) {
    Array i;
    Array q;
    for (std::int64_t k = 0; k < samples_; ++k) {
      i.emplace_back(k - 10);
      q.emplace_back(-1000 * k);
    }
    images.emplace_back(Dictionary{{"number", image + 4294967290U},
                                   {"i", std::move(i)},
                                   {"q", std::move(q)},
                                   {"temperature", 36.6F},
                                   {"label", "a, \"b\""}});
  }
  auto result = std::make_unique<QZExperimentResult>();
  result->auxiliaryData().set("pictures", std::move(images));
  return result;
}

}  // namespace quazor::fake

#include "ui/qt/OFLStatusController.h"

#include <QVBoxLayout>

#include "ui/qt/OFLProgress.h"

namespace {

// The grey the panel hands to setColor when it is made.
constexpr double kInitialGrey = 0.9;

}  // namespace

OFLStatusController::OFLStatusController(QWidget* parent_I) : QWidget(parent_I) {
  mProgress = OFLProgress::MakeBar(this);
  mStatusText = OFLProgress::MakeStatusLine(this);
  auto* layout = new QVBoxLayout(this);
  layout->setContentsMargins(0, 0, 0, 0);
  layout->addWidget(mProgress);
  layout->addWidget(mStatusText);
  setColor(QColor::fromRgbF(kInitialGrey, kInitialGrey, kInitialGrey));
  repaint();
}

void OFLStatusController::setProgress(double value_I) {
  mValue = value_I;
  OFLProgress::Show(*mProgress, mValue);
}

void OFLStatusController::setStatusText(const QString& text_I) {
  OFLProgress::Show(*mStatusText, text_I);
}

void OFLStatusController::setColor(const QColor& /*color_I*/) {}

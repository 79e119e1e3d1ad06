#include "ui/qt/OFLUpdateController.h"

#include <QHBoxLayout>
#include <QVBoxLayout>

#include "host/CLanguageManager.h"
#include "ui/qt/OFLProgress.h"
#include "ui/qt/OFLSvgView.h"

namespace {

constexpr int kIconSide = 56;

OFLSvgView* MakeIcon(const char* name_I, const char* meaning_I, QWidget* parent_I) {
  auto* icon = new OFLSvgView(QString::fromLatin1(name_I), kIconSide, parent_I);
  icon->setAccessibleName(QString::fromStdString(TTCLocalizedNSString(meaning_I)));
  icon->setToolTip(icon->accessibleName());
  return icon;
}

}  // namespace

OFLUpdateController::OFLUpdateController(QWidget* parent_I) : QWidget(parent_I) {
  mIconPlug = MakeIcon("Icon_Plug", "Keep the device connected.", this);
  mIconTouch = MakeIcon("Icon_Opaque", "Do not use the tablet or the pen.", this);
  mIconShutdown = MakeIcon("Icon_Shutdown", "Do not switch the device or the computer off.", this);
  mProgress = OFLProgress::MakeBar(this);
  mStatusText = OFLProgress::MakeStatusLine(this);

  auto* icons = new QHBoxLayout;
  icons->addStretch();
  for (QWidget* icon : {static_cast<QWidget*>(mIconPlug), static_cast<QWidget*>(mIconTouch),
                        static_cast<QWidget*>(mIconShutdown)}) {
    icons->addWidget(icon);
    icons->addSpacing(24);
  }
  icons->removeItem(icons->itemAt(icons->count() - 1));
  icons->addStretch();

  auto* layout = new QVBoxLayout(this);
  layout->setContentsMargins(20, 20, 20, 16);
  layout->setSpacing(14);
  layout->addLayout(icons);
  layout->addWidget(mProgress);
  layout->addWidget(mStatusText);
  setMinimumWidth(460);
}

void OFLUpdateController::setProgress(double value_I) {
  mValue = value_I + 1.0;
  OFLProgress::Show(*mProgress, mValue);
}

void OFLUpdateController::setStatusText(const QString& text_I) {
  OFLProgress::Show(*mStatusText, text_I);
}

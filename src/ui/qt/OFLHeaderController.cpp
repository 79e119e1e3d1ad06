#include "ui/qt/OFLHeaderController.h"

#include <QHBoxLayout>

#include "host/CLanguageManager.h"

OFLHeaderController::OFLHeaderController(QWidget* parent_I) : QWidget(parent_I) {
  mLabel = new QLabel(QString::fromStdString(TTCLocalizedNSString("Tablet:")), this);
  mName = new QLabel(this);
  mName->setTextFormat(Qt::PlainText);
  mName->setAccessibleName(QString::fromStdString(TTCLocalizedNSString("Tablet")));
  mName->setTextInteractionFlags(Qt::TextSelectableByMouse);
  QFont bold = mName->font();
  bold.setBold(true);
  mName->setFont(bold);

  // The band draws its own background, a shade apart from the panel below.
  setAutoFillBackground(true);
  QPalette band = palette();
  band.setColor(QPalette::Window, band.color(QPalette::Base));
  setPalette(band);

  auto* layout = new QHBoxLayout(this);
  layout->setContentsMargins(16, 12, 16, 12);
  layout->addWidget(mLabel);
  layout->addWidget(mName, 1);
}

#include "ui/qt/OFLConfirmationController.h"

#include <QHBoxLayout>
#include <QLabel>
#include <QVBoxLayout>

#include "host/CLanguageManager.h"
#include "ui/qt/OFLImages.h"
#include "ui/qt/OFLSvgView.h"

namespace {

constexpr int kIconSide = 48;

QString Button(const SAlert& question_I, size_t index_I, const char* fallback_I) {
  return QString::fromStdString(question_I.buttons.size() > index_I
                                    ? question_I.buttons[index_I]
                                    : TTCLocalizedNSString(fallback_I));
}

}  // namespace

OFLConfirmationController::OFLConfirmationController(const SAlert& question_I, QWidget* parent_I)
    : QDialog(parent_I) {
  setWindowTitle(QString::fromStdString(question_I.message));
  setModal(true);
  setWindowIcon(OFLImages::ApplicationIcon());

  auto* icons = new QHBoxLayout;
  icons->addStretch();
  for (const char* name : {"Icon_Plug", "Icon_Opaque", "Icon_Shutdown"}) {
    icons->addWidget(new OFLSvgView(QString::fromLatin1(name), kIconSide, this));
    icons->addSpacing(20);
  }
  icons->addStretch();

  auto* message = new QLabel(QString::fromStdString(question_I.message), this);
  QFont bold = message->font();
  bold.setBold(true);
  message->setFont(bold);
  auto* text = new QLabel(QString::fromStdString(question_I.informativeText), this);
  text->setTextFormat(Qt::PlainText);
  text->setWordWrap(true);

  // The safe answer is the one Return gives.
  mCancelButton = new QPushButton(Button(question_I, 0, "Cancel"), this);
  mUpdateButton = new QPushButton(Button(question_I, 1, "Update"), this);
  mCancelButton->setDefault(true);
  auto* buttons = new QHBoxLayout;
  buttons->addStretch();
  buttons->addWidget(mCancelButton);
  buttons->addWidget(mUpdateButton);

  auto* layout = new QVBoxLayout(this);
  layout->setContentsMargins(20, 20, 20, 16);
  layout->setSpacing(12);
  layout->addLayout(icons);
  layout->addWidget(message);
  layout->addWidget(text);
  layout->addLayout(buttons);
  // Sized from its content, the wrapped text's height included, at any
  // scale; a text cut off at the bottom is worse than a window that
  // cannot be resized.
  text->setMinimumWidth(text->fontMetrics().averageCharWidth() * 56);
  layout->setSizeConstraint(QLayout::SetFixedSize);

  connect(mUpdateButton, &QPushButton::clicked, this,
          &OFLConfirmationController::actionButtonUpdate);
  connect(mCancelButton, &QPushButton::clicked, this,
          &OFLConfirmationController::actionButtonCancel);
}

bool OFLConfirmationController::runModal() {
  exec();
  return mUpdate;
}

void OFLConfirmationController::actionButtonUpdate() {
  mUpdate = true;
  accept();
}

void OFLConfirmationController::actionButtonCancel() {
  mUpdate = false;
  reject();
}

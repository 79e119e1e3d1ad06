#include "ui/qt/OFLProgress.h"

#include <algorithm>
#include <cmath>

#include "host/CLanguageManager.h"

namespace OFLProgress {

QProgressBar* MakeBar(QWidget* parent_I) {
  auto* bar = new QProgressBar(parent_I);
  bar->setRange(0, 100);
  bar->setValue(50);
  bar->setAccessibleName(QString::fromStdString(TTCLocalizedNSString("Progress")));
  return bar;
}

QLabel* MakeStatusLine(QWidget* parent_I) {
  auto* line = new QLabel(parent_I);
  line->setAccessibleName(QString::fromStdString(TTCLocalizedNSString("Status")));
  line->setTextFormat(Qt::PlainText);
  // Long translations take a second line rather than being cut.
  line->setWordWrap(true);
  line->setAlignment(Qt::AlignLeft | Qt::AlignTop);
  line->setMinimumHeight(2 * line->fontMetrics().lineSpacing());
  return line;
}

void Show(QProgressBar& bar_I, double value_I) {
  // QProgressBar ignores a value outside its range; the bar shows the
  // nearest end instead.
  const int shown =
      std::isnan(value_I) ? 0 : static_cast<int>(std::lround(std::clamp(value_I, 0.0, 100.0)));
  bar_I.setValue(shown);
  bar_I.repaint();
}

void Show(QLabel& line_I, const QString& text_I) {
  line_I.setText(text_I);
  line_I.repaint();
}

}  // namespace OFLProgress

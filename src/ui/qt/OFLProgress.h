#pragma once
// What the window's bars share: a 0..100 bar, a status line under it, and
// how a value that may lie outside (or be NaN) lands on the bar.

#include <QLabel>
#include <QProgressBar>
#include <QString>

namespace OFLProgress {

QProgressBar* MakeBar(QWidget* parent_I);
QLabel* MakeStatusLine(QWidget* parent_I);
// Sets and draws at once.
void Show(QProgressBar& bar_I, double value_I);
void Show(QLabel& line_I, const QString& text_I);

}  // namespace OFLProgress

#pragma once
// The full dialog's status panel: progress bar and status text. Its
// progress is the plain value, unlike the update dialog's.

#include <QColor>
#include <QLabel>
#include <QProgressBar>
#include <QWidget>

class OFLStatusController : public QWidget {
  Q_OBJECT
 public:
  explicit OFLStatusController(QWidget* parent_I = nullptr);

  void setProgress(double value_I);
  void setStatusText(const QString& text_I);
  // Takes the states' colour and shows nothing of it: the window has
  // never coloured its status.
  void setColor(const QColor& color_I);

  double GetProgress() const { return mValue; }
  QString GetStatusText() const { return mStatusText->text(); }
  QProgressBar* GetProgressBar() const { return mProgress; }

 private:
  QProgressBar* mProgress;
  QLabel* mStatusText;
  double mValue = 50.0;
};

#pragma once
// The update dialog's one panel: three icons that say what not to do while
// the firmware is written, the progress bar and one status line.
//
// setProgress shows the value plus one, as the window always has: 100
// arrives as 101, which the 0..100 bar shows full. The value as set is kept
// for whoever asks.

#include <QLabel>
#include <QProgressBar>
#include <QWidget>

class OFLSvgView;

class OFLUpdateController : public QWidget {
  Q_OBJECT
 public:
  explicit OFLUpdateController(QWidget* parent_I = nullptr);

  // Drawn before it returns: it arrives inside a dispatch that holds the
  // update thread, and the main thread may sleep right after.
  void setProgress(double value_I);
  void setStatusText(const QString& text_I);

  double GetProgress() const { return mValue; }
  QString GetStatusText() const { return mStatusText->text(); }
  QProgressBar* GetProgressBar() const { return mProgress; }

 private:
  OFLSvgView* mIconPlug;
  OFLSvgView* mIconTouch;
  OFLSvgView* mIconShutdown;
  QProgressBar* mProgress;
  QLabel* mStatusText;
  double mValue = 50.0;
};

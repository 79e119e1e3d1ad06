#pragma once
// The top-level window of both dialogs, with its menu bar. A request to
// close it (the title bar's button, the Quit item, the window manager) is
// never carried out here: it goes to the close request handler, which
// decides.
//
// With TAVIK_REPORT_FIRST_FRAME set in the environment, the window writes
// "first frame" to standard error once its first frame is drawn: the
// start-up benchmark times a run up to that line.

#include <QMainWindow>
#include <QMenu>
#include <functional>

class OFLMainWindow : public QMainWindow {
  Q_OBJECT
 public:
  explicit OFLMainWindow(QWidget* parent_I = nullptr);

  void SetCloseRequestHandler(std::function<void()> handler_I) {
    mCloseRequest = std::move(handler_I);
  }
  // The title bar's close button and every top-level menu.
  void SetCloseEnabled(bool enable_I);
  bool GetCloseEnabled() const { return mCloseEnabled; }
  const QList<QMenu*>& GetMenus() const { return mMenus; }

 signals:
  // Once, when the first frame has been drawn and handed to the platform.
  void firstFrame();

 protected:
  void closeEvent(QCloseEvent* event_I) override;
  bool event(QEvent* event_I) override;

 private:
  void ShowAbout();

  std::function<void()> mCloseRequest;
  QList<QMenu*> mMenus;
  bool mCloseEnabled = true;
  bool mFramed = false;
};

#pragma once
// The top-level window of both dialogs, with its menu bar. A request to
// close it (the title bar's button, the Quit item, the window manager) is
// never carried out here: it goes to the close request handler, which
// decides.

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

 protected:
  void closeEvent(QCloseEvent* event_I) override;

 private:
  void ShowAbout();

  std::function<void()> mCloseRequest;
  QList<QMenu*> mMenus;
  bool mCloseEnabled = true;
};

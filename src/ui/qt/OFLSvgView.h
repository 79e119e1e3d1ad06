#pragma once
// One of the window's images, painted from its vectors at each paint, so it
// is sharp at 100 % and 200 % alike. Keeps the image's aspect, centred.

#include <QSvgRenderer>
#include <QWidget>

class OFLSvgView : public QWidget {
  Q_OBJECT
 public:
  // `name_I` as for OFLImages; `side_I` the logical size in pixels.
  OFLSvgView(const QString& name_I, int side_I, QWidget* parent_I = nullptr);

  QSize sizeHint() const override { return QSize(mSide, mSide); }

 protected:
  void paintEvent(QPaintEvent* event_I) override;

 private:
  QSvgRenderer mRenderer;
  int mSide;
};

#include "ui/qt/OFLSvgView.h"

#include <QPainter>

#include "ui/qt/OFLImages.h"

OFLSvgView::OFLSvgView(const QString& name_I, int side_I, QWidget* parent_I)
    : QWidget(parent_I), mRenderer(OFLImages::PathOf(name_I)), mSide(side_I) {
  setFixedSize(side_I, side_I);
  setObjectName(name_I);
}

void OFLSvgView::paintEvent(QPaintEvent* /*event_I*/) {
  if (!mRenderer.isValid()) return;
  QSizeF image = mRenderer.defaultSize();
  image.scale(size(), Qt::KeepAspectRatio);
  const QRectF target(QPointF((width() - image.width()) / 2.0, (height() - image.height()) / 2.0),
                      image);
  QPainter painter(this);
  painter.setRenderHint(QPainter::Antialiasing);
  mRenderer.render(&painter, target);
}

#pragma once
// The full dialog's header: the tablet's label and its name, on a band of
// its own at the top of the window.

#include <QLabel>
#include <QWidget>

class OFLHeaderController : public QWidget {
  Q_OBJECT
 public:
  explicit OFLHeaderController(QWidget* parent_I = nullptr);

  void setLabel(const QString& label_I) { mLabel->setText(label_I); }
  void setName(const QString& name_I) { mName->setText(name_I); }
  QString GetName() const { return mName->text(); }

 private:
  QLabel* mLabel;
  QLabel* mName;
};

#pragma once
// The confirmation before a display scalar is written through its bridge:
// a modal window of its own with the same three icons as the update
// dialog, the question, and "Cancel" and "Update".
//
// Only the two buttons change the answer. Closing the window any other way
// (Escape, the close button) leaves it as it stood, which is no unless a
// button said otherwise.

#include <QDialog>
#include <QPushButton>

#include "update/CWindowController.h"

class OFLConfirmationController : public QDialog {
  Q_OBJECT
 public:
  // `question_I.buttons`: {cancel, update}.
  explicit OFLConfirmationController(const SAlert& question_I, QWidget* parent_I = nullptr);

  // Shows the window modally; the answer.
  bool runModal();
  bool GetUpdate() const { return mUpdate; }
  QPushButton* GetUpdateButton() const { return mUpdateButton; }
  QPushButton* GetCancelButton() const { return mCancelButton; }

 public slots:
  void actionButtonUpdate();
  void actionButtonCancel();

 private:
  bool mUpdate = false;
  QPushButton* mUpdateButton;
  QPushButton* mCancelButton;
};

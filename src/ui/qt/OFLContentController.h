#pragma once
// The full dialog's board panel: the board list, the firmware file with its
// browse button, the program button, the pen's and touch controller's
// version and checksums (six read-only fields), and the place where the
// status panel sits.
//
// Its buttons act on the application: the board list sets the update type
// on the updater, browse lets the user pick the file and hands it to the
// updater, program asks for confirmation and starts the update.

#include <QComboBox>
#include <QLineEdit>
#include <QPushButton>
#include <QStringList>
#include <QWidget>
#include <cstdint>
#include <string>
#include <vector>

class FLAppDelegate;

class OFLContentController : public QWidget {
  Q_OBJECT
 public:
  explicit OFLContentController(QWidget* parent_I = nullptr);

  // Where the buttons' actions go; null leaves them without effect.
  void SetApplication(FLAppDelegate* application_I) { mApplication = application_I; }
  // The folder under which "Firmware" holds the images, for the file chooser.
  void SetDataFolder(const QString& folder_I) { mDataFolder = folder_I; }

  void enableUIElements(bool enable_I);
  void enableProgramButton(bool enable_I);
  // Board names as the updater knows them; each is shown translated.
  void setBoardList(const std::vector<std::string>& boards_I);
  void setPenFirmwareVersion(uint32_t version_I);
  void setPenOldChecksum(uint32_t checksum_I);
  void setPenNewChecksum(uint32_t checksum_I);
  void setTouchFirmwareVersion(uint32_t version_I);
  void setTouchOldChecksum(uint32_t checksum_I);
  void setTouchNewChecksum(uint32_t checksum_I);
  QWidget* getStatusView() const { return mStatusView; }

  // 0xFFFFFFFF is "N/A". Otherwise bits 8 to 23 in hexadecimal, then the low
  // byte's tens and units: 0x0102 is "1.0.2", 0x0A2B is "a.4.3".
  static QString formatFirmwareVersion(uint32_t version_I);
  static QString formatChecksum(uint32_t checksum_I);
  // The extensions offered for a board, compared without case; an empty
  // list (any file) for a board it does not know.
  static QStringList allowedFileTypesWith(const std::string& board_I);
  // The folder the chooser opens in: "Firmware/<device name, blanks as
  // underscores>" under the data folder, or "Firmware" itself when that
  // folder cannot be reached.
  static QString FirmwareFolderFor(const QString& dataFolder_I, const std::string& deviceName_I);

  // The controls, for the window's tab order and for tests.
  QComboBox* GetBoardList() const { return mBoardList; }
  QLineEdit* GetFileField() const { return mBoardVersion; }
  QPushButton* GetBrowseButton() const { return mBrowseButton; }
  QPushButton* GetProgramButton() const { return mProgramButton; }
  QLineEdit* GetPenFirmwareVersion() const { return mPenFirmwareVersion; }
  QLineEdit* GetPenOldChecksum() const { return mPenOldChecksum; }
  QLineEdit* GetPenNewChecksum() const { return mPenNewChecksum; }
  QLineEdit* GetTouchFirmwareVersion() const { return mTouchFirmwareVersion; }
  QLineEdit* GetTouchOldChecksum() const { return mTouchOldChecksum; }
  QLineEdit* GetTouchNewChecksum() const { return mTouchNewChecksum; }
  int GetDropDownIndex() const { return mDropDownIndex; }

 public slots:
  void UpdateTypeChanged(int index_I);
  void OpenFile();
  void BoardProgram();

 private:
  QLineEdit* MakeField(const char* name_I);

  FLAppDelegate* mApplication = nullptr;
  QString mDataFolder;
  QComboBox* mBoardList;
  int mDropDownIndex = -1;
  QLineEdit* mBoardVersion;
  QPushButton* mBrowseButton;
  QPushButton* mProgramButton;
  QLineEdit* mPenFirmwareVersion;
  QLineEdit* mPenOldChecksum;
  QLineEdit* mPenNewChecksum;
  QLineEdit* mTouchFirmwareVersion;
  QLineEdit* mTouchOldChecksum;
  QLineEdit* mTouchNewChecksum;
  QWidget* mStatusView;
};

#include "ui/qt/OFLContentController.h"

#include <QDir>
#include <QFileDialog>
#include <QFontDatabase>
#include <QGridLayout>
#include <QHBoxLayout>
#include <QLabel>
#include <QVBoxLayout>
#include <algorithm>

#include "common/StringUtilities.h"
#include "host/CLanguageManager.h"
#include "update/FLAppDelegate.h"
#include "update/OFLUpdater.h"

namespace {

constexpr uint32_t kUnknownVersion = 0xFFFFFFFF;

QString T(const char* key_I) { return QString::fromStdString(TTCLocalizedNSString(key_I)); }

}  // namespace

OFLContentController::OFLContentController(QWidget* parent_I) : QWidget(parent_I) {
  mBoardList = new QComboBox(this);
  mBoardList->setAccessibleName(T("Board"));
  mBoardVersion = new QLineEdit(this);
  mBoardVersion->setReadOnly(true);
  mBoardVersion->setAccessibleName(T("Firmware file"));
  mBrowseButton = new QPushButton(T("B&rowse..."), this);
  mProgramButton = new QPushButton(T("&Program"), this);
  mProgramButton->setDefault(true);
  // Nothing to program until a file is taken.
  mProgramButton->setEnabled(false);
  mPenFirmwareVersion = MakeField("Pen firmware version");
  mPenOldChecksum = MakeField("Pen checksum");
  mPenNewChecksum = MakeField("Pen checksum of the new firmware");
  mTouchFirmwareVersion = MakeField("Touch firmware version");
  mTouchOldChecksum = MakeField("Touch checksum");
  mTouchNewChecksum = MakeField("Touch checksum of the new firmware");
  mStatusView = new QWidget(this);

  auto* boardLabel = new QLabel(T("&Board:"), this);
  boardLabel->setBuddy(mBoardList);
  auto* fileLabel = new QLabel(T("F&irmware file:"), this);
  fileLabel->setBuddy(mBoardVersion);

  // One grid, so that the board, the file and the boards' fields share
  // their columns. Boards as rows: what the board runs now, then what the
  // file brings.
  auto* grid = new QGridLayout;
  grid->setHorizontalSpacing(10);
  grid->addWidget(boardLabel, 0, 0);
  grid->addWidget(mBoardList, 0, 1);
  grid->addWidget(fileLabel, 1, 0);
  grid->addWidget(mBoardVersion, 1, 1, 1, 2);
  grid->addWidget(mBrowseButton, 1, 3);
  grid->addWidget(new QLabel(T("Firmware version"), this), 2, 1);
  grid->addWidget(new QLabel(T("Checksum"), this), 2, 2);
  grid->addWidget(new QLabel(T("New checksum"), this), 2, 3);
  grid->addWidget(new QLabel(T("Pen"), this), 3, 0);
  grid->addWidget(mPenFirmwareVersion, 3, 1);
  grid->addWidget(mPenOldChecksum, 3, 2);
  grid->addWidget(mPenNewChecksum, 3, 3);
  grid->addWidget(new QLabel(T("Touch"), this), 4, 0);
  grid->addWidget(mTouchFirmwareVersion, 4, 1);
  grid->addWidget(mTouchOldChecksum, 4, 2);
  grid->addWidget(mTouchNewChecksum, 4, 3);
  for (int column = 1; column <= 3; ++column) grid->setColumnStretch(column, 1);
  // Room between the file and the table's headings.
  grid->setRowMinimumHeight(2, grid->rowMinimumHeight(2) + 8);

  auto* buttons = new QHBoxLayout;
  buttons->addStretch();
  buttons->addWidget(mProgramButton);

  auto* layout = new QVBoxLayout(this);
  layout->setContentsMargins(16, 14, 16, 14);
  layout->setSpacing(12);
  layout->addLayout(grid);
  layout->addWidget(mStatusView);
  layout->addLayout(buttons);

  setTabOrder(mBoardList, mBoardVersion);
  setTabOrder(mBoardVersion, mBrowseButton);
  setTabOrder(mBrowseButton, mPenFirmwareVersion);
  setTabOrder(mPenFirmwareVersion, mPenOldChecksum);
  setTabOrder(mPenOldChecksum, mPenNewChecksum);
  setTabOrder(mPenNewChecksum, mTouchFirmwareVersion);
  setTabOrder(mTouchFirmwareVersion, mTouchOldChecksum);
  setTabOrder(mTouchOldChecksum, mTouchNewChecksum);
  setTabOrder(mTouchNewChecksum, mProgramButton);

  // activated comes from the user only; the list's own selection in
  // setBoardList does not change the update type.
  connect(mBoardList, &QComboBox::activated, this, &OFLContentController::UpdateTypeChanged);
  connect(mBrowseButton, &QPushButton::clicked, this, &OFLContentController::OpenFile);
  connect(mProgramButton, &QPushButton::clicked, this, &OFLContentController::BoardProgram);
}

QLineEdit* OFLContentController::MakeField(const char* name_I) {
  auto* field = new QLineEdit(this);
  field->setReadOnly(true);
  field->setAccessibleName(T(name_I));
  // Fixed pitch, so that the checksums' padding lines their digits up.
  field->setFont(QFontDatabase::systemFont(QFontDatabase::FixedFont));
  field->setMinimumWidth(field->fontMetrics().horizontalAdvance(QStringLiteral("0000.00.0")) + 16);
  return field;
}

void OFLContentController::enableUIElements(bool enable_I) {
  mBrowseButton->setEnabled(enable_I);
  mBoardList->setEnabled(enable_I);
}

void OFLContentController::enableProgramButton(bool enable_I) {
  mProgramButton->setEnabled(enable_I);
}

void OFLContentController::setBoardList(const std::vector<std::string>& boards_I) {
  mBoardList->clear();
  for (const std::string& board : boards_I) {
    mBoardList->addItem(QString::fromStdString(TTCLocalizedNSString(board)),
                        QString::fromStdString(board));
  }
  if (mDropDownIndex == -1) mDropDownIndex = 0;
  mBoardList->setCurrentIndex(mDropDownIndex);
}

void OFLContentController::setPenFirmwareVersion(uint32_t version_I) {
  mPenFirmwareVersion->setText(formatFirmwareVersion(version_I));
}
void OFLContentController::setPenOldChecksum(uint32_t checksum_I) {
  mPenOldChecksum->setText(formatChecksum(checksum_I));
}
void OFLContentController::setPenNewChecksum(uint32_t checksum_I) {
  mPenNewChecksum->setText(formatChecksum(checksum_I));
}
void OFLContentController::setTouchFirmwareVersion(uint32_t version_I) {
  mTouchFirmwareVersion->setText(formatFirmwareVersion(version_I));
}
void OFLContentController::setTouchOldChecksum(uint32_t checksum_I) {
  mTouchOldChecksum->setText(formatChecksum(checksum_I));
}
void OFLContentController::setTouchNewChecksum(uint32_t checksum_I) {
  mTouchNewChecksum->setText(formatChecksum(checksum_I));
}

QString OFLContentController::formatFirmwareVersion(uint32_t version_I) {
  if (version_I == kUnknownVersion) return QStringLiteral("N/A");
  const unsigned int low = version_I & 0xFF;
  return QString::fromStdString(
      StringUtilities::Format("%x.%x.%x", (version_I >> 8) & 0xFFFF, low / 10, low % 10));
}

QString OFLContentController::formatChecksum(uint32_t checksum_I) {
  return QString::fromStdString(StringUtilities::Format("%4x", checksum_I));
}

QStringList OFLContentController::allowedFileTypesWith(const std::string& board_I) {
  if (StringUtilities::IEquals(board_I, "pen")) return {"pen", "tav"};
  if (StringUtilities::IEquals(board_I, "touch")) return {"touch", "hex"};
  if (StringUtilities::IEquals(board_I, "bluetooth")) return {"airoflash"};
  if (StringUtilities::IEquals(board_I, "scalar")) return {"bin"};
  return {};
}

QString OFLContentController::FirmwareFolderFor(const QString& dataFolder_I,
                                                const std::string& deviceName_I) {
  std::string name = deviceName_I;
  std::replace(name.begin(), name.end(), ' ', '_');
  const QString firmware = QDir(dataFolder_I).filePath(QStringLiteral("Firmware"));
  const QString folder = QDir(firmware).filePath(QString::fromStdString(name));
  const QDir device(folder);
  return device.exists() && device.isReadable() ? folder : firmware;
}

void OFLContentController::UpdateTypeChanged(int index_I) {
  if (index_I == mDropDownIndex || mApplication == nullptr) return;
  OFLUpdater::updater()->setUpdateType(mBoardList->itemData(index_I).toString().toStdString());
  mDropDownIndex = index_I;
}

void OFLContentController::OpenFile() {
  if (mApplication == nullptr) return;
  OFLUpdater* updater = OFLUpdater::updater();
  const std::string board = mBoardList->currentData().toString().toStdString();
  QFileDialog panel(window(), T("Choose the firmware file"));
  // The same chooser on every desktop, reachable by the tests as well.
  panel.setOption(QFileDialog::DontUseNativeDialog);
  panel.setFileMode(QFileDialog::ExistingFile);
  if (const std::shared_ptr<CDevice> device = updater->getSelectedDevice()) {
    panel.setDirectory(FirmwareFolderFor(mDataFolder, device->GetDeviceName()));
  }
  const QStringList types = allowedFileTypesWith(board);
  if (!types.isEmpty()) {
    QStringList patterns;
    for (const QString& type : types) patterns << QStringLiteral("*.") + type;
    panel.setNameFilter(T("Firmware files") + QStringLiteral(" (") + patterns.join(' ') + ')');
  }
  if (panel.exec() != QDialog::Accepted || panel.selectedFiles().isEmpty()) return;

  const QString path = panel.selectedFiles().constFirst();
  mBoardVersion->setText(path);
  mBoardVersion->setToolTip(path);
  if (!updater->setFileURL(path.toStdString())) {
    mApplication->notifyDialog(TTCLocalizedNSString(
        "Error: The specified file does not appear to be a valid firmware file."));
  }
}

void OFLContentController::BoardProgram() {
  if (mApplication == nullptr || !mApplication->confirmProgram()) return;
  OFLUpdater::updater()->boardProgram();
}

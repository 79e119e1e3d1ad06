#include "ui/qt/OFLImages.h"

#include <QFile>

// A resource in a static library is registered only when something calls
// its initialiser; the macro must be used outside any namespace.
static void RegisterImageResource() { Q_INIT_RESOURCE(OFLResources); }

namespace OFLImages {

QString PathOf(const QString& name_I) {
  static const bool registered = (RegisterImageResource(), true);
  (void)registered;
  return QStringLiteral(":/tavik/") + name_I + QStringLiteral(".svg");
}

QIcon tavikImageNamed(const QString& name_I) {
  const QString path = PathOf(name_I);
  return QFile::exists(path) ? QIcon(path) : QIcon();
}

QIcon ApplicationIcon() { return tavikImageNamed(QStringLiteral("tavik-fwupdater")); }

}  // namespace OFLImages

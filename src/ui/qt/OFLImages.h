#pragma once
// The window's own images, drawn as SVG and kept in this library's Qt
// resource. Vectors are drawn at the density of the screen they land on, so
// they stay sharp at any scale.

#include <QIcon>
#include <QString>

namespace OFLImages {

// The resource path of an image by its name: "Icon_Plug" gives
// ":/tavik/Icon_Plug.svg".
QString PathOf(const QString& name_I);
// The image as an icon, rendered at the size and density it is asked for.
QIcon tavikImageNamed(const QString& name_I);
// The program's icon, for its windows and alerts.
QIcon ApplicationIcon();

}  // namespace OFLImages

#pragma once

#include <QString>

/// The commented configuration file that a new user starts from: 79 lines, each ended by a line feed. @p path is named in
/// its head.
QString configTemplate(const QString &path);

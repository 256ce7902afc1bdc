// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "DataSource/src/FileListing.h"

namespace DataSource
{

FileListing::FileListing(const QString& directory) : iterator(directory, QDir::Files) {}

bool FileListing::step()
{
    if (!iterator.hasNext())
        return false;
    iterator.next();
    started = true;
    return true;
}

bool FileListing::step(qint64 times)
{
    for (qint64 done = 0; done < times; ++done) {
        if (!step())
            return false;
    }
    return true;
}

} // namespace DataSource

// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/presentation/ObjectRecorder.h"

#include <QMutex>
#include <QObject>

/// Qt's table of callbacks for tools; the entries are numbered in its private header.
extern quintptr Q_CORE_EXPORT qtHookData[];

namespace TestSupport
{

namespace
{

constexpr int addObject = 3;
constexpr int removeObject = 4;

QMutex mutex;
QList<QObject*> objects;
QList<QObject*> watched;
QStringList watchedNames;
QStringList destroyedNames;

void added(QObject* object)
{
    const QMutexLocker lock(&mutex);
    objects.append(object);
}

void removed(QObject* object)
{
    const QMutexLocker lock(&mutex);
    objects.removeOne(object);
    const auto index = watched.indexOf(object);
    if (index >= 0)
        destroyedNames.append(watchedNames.at(index));
}

} // namespace

ObjectRecorder::ObjectRecorder()
{
    objects.clear();
    watched.clear();
    watchedNames.clear();
    destroyedNames.clear();
    qtHookData[addObject] = reinterpret_cast<quintptr>(&added);
    qtHookData[removeObject] = reinterpret_cast<quintptr>(&removed);
}

ObjectRecorder::~ObjectRecorder()
{
    qtHookData[addObject] = 0;
    qtHookData[removeObject] = 0;
}

QList<QObject*> ObjectRecorder::living() const
{
    const QMutexLocker lock(&mutex);
    return objects;
}

void ObjectRecorder::watch(const QList<QObject*>& chosen, const QStringList& names)
{
    const QMutexLocker lock(&mutex);
    watched = chosen;
    watchedNames = names;
}

QStringList ObjectRecorder::destroyed() const
{
    const QMutexLocker lock(&mutex);
    return destroyedNames;
}

} // namespace TestSupport

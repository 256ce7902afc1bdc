// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/presentation/ObjectRecorder.h"

#include <QMutex>
#include <QObject>

#include <algorithm>
#include <vector>

/// Qt's table of callbacks for tools; the entries are numbered in its private header.
extern quintptr Q_CORE_EXPORT qtHookData[];

namespace TestSupport
{

namespace
{

constexpr int addObject = 3;
constexpr int removeObject = 4;

QMutex mutex;
// Objects come and go in every thread: what is kept is not shared with the copies that are given out.
std::vector<QObject*> objects;
std::vector<QObject*> watched;
std::vector<QString> watchedNames;
std::vector<QString> destroyedNames;

void added(QObject* object)
{
    const QMutexLocker lock(&mutex);
    objects.push_back(object);
}

void removed(QObject* object)
{
    const QMutexLocker lock(&mutex);
    if (const auto living = std::find(objects.begin(), objects.end(), object); living != objects.end())
        objects.erase(living);
    if (const auto found = std::find(watched.begin(), watched.end(), object); found != watched.end())
        destroyedNames.push_back(watchedNames.at(static_cast<std::size_t>(found - watched.begin())));
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
    return {objects.begin(), objects.end()};
}

void ObjectRecorder::watch(const QList<QObject*>& chosen, const QStringList& names)
{
    const QMutexLocker lock(&mutex);
    watched.assign(chosen.begin(), chosen.end());
    watchedNames.assign(names.begin(), names.end());
}

QStringList ObjectRecorder::destroyed() const
{
    const QMutexLocker lock(&mutex);
    return {destroyedNames.begin(), destroyedNames.end()};
}

} // namespace TestSupport

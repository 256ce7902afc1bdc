// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include <QByteArray>
#include <QDir>
#include <QFile>

#include <cstdint>
#include <cstdio>

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* bytes, std::size_t size);

/// Runs a fuzz target over the files of its corpus, without a fuzzer: FOLDER. An empty corpus is a mistake.
int main(int argc, char** argv)
{
    if (argc != 2)
        return 2;
    const QDir folder(QFile::decodeName(argv[1]));
    const auto names = folder.entryList(QDir::Files);
    for (const auto& name : names) {
        QFile file(folder.filePath(name));
        if (!file.open(QIODevice::ReadOnly))
            return 1;
        const QByteArray input = file.readAll();
        LLVMFuzzerTestOneInput(reinterpret_cast<const std::uint8_t*>(input.constData()),
                               static_cast<std::size_t>(input.size()));
    }
    std::printf("%d inputs\n", static_cast<int>(names.size()));
    return names.isEmpty() ? 1 : 0;
}

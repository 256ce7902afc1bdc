# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
immunityrig_test(XmlConfigurationDataTest SOURCES DataSource/XmlConfigurationDataTest.cpp LIBRARIES DataSource LABELS unit)
immunityrig_test(XmlConfigurationPropertyTest SOURCES DataSource/XmlConfigurationPropertyTest.cpp LIBRARIES DataSource
  LABELS unit property)
add_library(FileStoreFixture STATIC DataSource/FileStoreFixture.cpp DataSource/FileStoreFixture.h)
target_link_libraries(FileStoreFixture PUBLIC TestSupport DataSource ${CMAKE_DL_LIBS})
target_precompile_headers(FileStoreFixture REUSE_FROM TestSupport)
foreach(test FileStoreTest FileStoreDeletionTest FileStoreCacheTest KeyedFileStoreTest)
  immunityrig_test(${test} SOURCES DataSource/${test}.cpp LIBRARIES FileStoreFixture LABELS unit)
endforeach()
immunityrig_test(DataSourceLayerTest SOURCES DataSource/DataSourceLayerTest.cpp LIBRARIES DataSource LABELS unit)

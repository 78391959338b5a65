#include <gtest/gtest.h>

#include "server/com_base.h"
#include "transfer/enum_format_etc.h"

namespace {

TEST(EnumFormatEtc, NextSkipCloneAndCounting) {
  const FORMATETC formats[4] = {{1, nullptr, DVASPECT_CONTENT, -1, TYMED_ISTREAM},
                                {2, nullptr, DVASPECT_CONTENT, -1, TYMED_HGLOBAL},
                                {3, nullptr, DVASPECT_CONTENT, -1, TYMED_HGLOBAL},
                                {4, nullptr, DVASPECT_CONTENT, -1, TYMED_HGLOBAL}};
  long locks = com::ModuleLockCount();
  CEnumFormatEtc* e = CEnumFormatEtc::Create(formats, 4);
  ASSERT_NE(e, nullptr);
  FORMATETC out[10]{};
  ULONG fetched = 0;
  EXPECT_EQ(e->Next(10, out, &fetched), S_OK) << "fewer than asked is still S_OK";
  EXPECT_EQ(fetched, 4u);
  EXPECT_EQ(out[3].cfFormat, 4);
  EXPECT_EQ(e->Next(1, out, &fetched), S_FALSE);
  e->Reset();
  EXPECT_EQ(e->Next(2, out, nullptr), E_POINTER);
  EXPECT_EQ(e->Next(1, nullptr, nullptr), S_FALSE);
  EXPECT_EQ(e->Skip(4), S_FALSE) << "exactly the end";
  EXPECT_EQ(e->Skip(0xFFFFFFFFu), S_FALSE);
  EXPECT_EQ(e->Skip(3), S_OK);

  IEnumFORMATETC* clone = nullptr;
  ASSERT_EQ(e->Clone(&clone), S_OK);
  EXPECT_EQ(clone->Next(1, out, nullptr), S_OK);
  EXPECT_EQ(out[0].cfFormat, 4) << "the clone starts where its original stood";
  EXPECT_EQ(clone->Release(), 0u);
  EXPECT_EQ(e->Next(1, out, nullptr), S_OK) << "and the original did not move";

  EXPECT_EQ(e->QueryInterface(IID_IUnknown, nullptr), E_POINTER);
  void* p = nullptr;
  EXPECT_EQ(e->QueryInterface(IID_IDataObject, &p), E_NOINTERFACE);
  EXPECT_EQ(e->Release(), 0u);

  CEnumFormatEtc* empty = CEnumFormatEtc::Create(nullptr, 0);
  EXPECT_EQ(empty->Next(1, out, &fetched), S_FALSE);
  EXPECT_EQ(empty->Skip(0), S_FALSE);
  empty->Release();
  EXPECT_EQ(com::ModuleLockCount(), locks);
}

}  // namespace

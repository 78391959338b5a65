// The creators behind the eight class objects of the object map. Each class's own
// source defines its creator; a class whose code is not in the module yet has its
// creator in server/pending_classes.cpp, answering CLASS_E_CLASSNOTAVAILABLE.
#pragma once
#include <windows.h>

HRESULT CreateMarlixDLShellFolder(REFIID riid, void** ppv);
HRESULT CreateMarlixDLShellView(REFIID riid, void** ppv);
HRESULT CreateMarlixDLEnumIDList(REFIID riid, void** ppv);
HRESULT CreateMarlixDLExtractIcon(REFIID riid, void** ppv);
HRESULT CreateMarlixDLDataObject(REFIID riid, void** ppv);
HRESULT CreateMarlixDLQueryInfo(REFIID riid, void** ppv);
HRESULT CreateMarlixDLDropTarget(REFIID riid, void** ppv);
HRESULT CreateMarlixDLDropTargetOnListView(REFIID riid, void** ppv);

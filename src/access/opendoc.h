// Opening a document: resolve it in the TeX tree or the document cache,
// fetch it from the documentation server when needed, start its viewer.
#pragma once

#include <string>

class AccessServices;

extern const char* DocumentServerURL;  // NULL until first needed
extern const char* const kDefaultDocumentServerURL;

// 1 when a viewer command line was started, 0 otherwise.
int OpenDocumentFile(AccessServices& services, const char* fileName, const char* anchor);

void Get_Doc_Server();
bool Is_Absolute_Path(const char* name);
bool Check_Loaded_PDF(const char* path);
int Make_File_Path(const char* filePath);
int Make_Path(const char* directory);

// Reading one PDF into the words it contributes.  Runs in a process of
// its own (see scanner.cpp): the PDF library may crash or hang on a bad file.
#pragma once

#include <string>

#include "scan/document_words.h"

// Commands and environments of every page, and where the document has a
// hyperlinked printed index, the physical pages its entries link to.  An
// unreadable document gives `error` set (damaged, encrypted, not a PDF).
DocumentWords ReadPdfWords(const std::string& path);

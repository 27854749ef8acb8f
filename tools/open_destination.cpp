// Destination lookup through poppler-glib.
#include "open_destination.h"

#include <poppler.h>

int DestinationPage(const std::string& file, const std::string& name) {
  // poppler opens URIs; a relative name is taken from the working directory.
  gchar* absolute = g_canonicalize_filename(file.c_str(), nullptr);
  gchar* uri = g_filename_to_uri(absolute, nullptr, nullptr);
  PopplerDocument* document =
      uri != nullptr ? poppler_document_new_from_file(uri, nullptr, nullptr) : nullptr;
  g_free(uri);
  g_free(absolute);
  if (document == nullptr) return 0;
  // Destination names are bytes, whatever they hold; poppler wants them
  // in its own encoding of bytes.
  char* key =
      poppler_named_dest_from_bytestring(reinterpret_cast<const guint8*>(name.data()), name.size());
  int page = 0;
  PopplerDest* dest = poppler_document_find_dest(document, key);
  if (dest != nullptr) {
    if (dest->page_num >= 1 && dest->page_num <= poppler_document_get_n_pages(document))
      page = dest->page_num;
    poppler_dest_free(dest);
  }
  g_free(key);
  g_object_unref(document);
  return page;
}

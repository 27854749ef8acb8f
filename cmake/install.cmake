# Install rules and the Debian package.
#   cmake --install build [--prefix /usr]       (DESTDIR is honoured)
#   cd build && cpack -G DEB
# The sample tree goes to <prefix>/share/docuvane/texmf, where the installed
# program finds it beside its own <prefix>/bin.
set(DOCUVANE_APP_ID org.lomari.Docuvane)

install(TARGETS docuvane docuvane-window docuvane-mkindex docuvane-mkpdf docuvane-open
        RUNTIME DESTINATION bin)
install(DIRECTORY "${DOCUVANE_SAMPLE_TEXMF}/" DESTINATION share/docuvane/texmf)
install(FILES "share/applications/${DOCUVANE_APP_ID}.desktop" DESTINATION share/applications)
install(FILES "share/metainfo/${DOCUVANE_APP_ID}.metainfo.xml" DESTINATION share/metainfo)
foreach(size IN LISTS DOCUVANE_ICON_SIZES)
  install(FILES "res/docuvane-${size}.png" DESTINATION "share/icons/hicolor/${size}x${size}/apps"
          RENAME "${DOCUVANE_APP_ID}.png")
endforeach()
foreach(program docuvane docuvane-mkindex docuvane-mkpdf docuvane-open)
  install(FILES "share/man/${program}.1" DESTINATION share/man/man1)
endforeach()

set(CPACK_PACKAGE_NAME docuvane)
set(CPACK_PACKAGE_VENDOR "Lomari")
set(CPACK_PACKAGE_CONTACT "Lomari Docuvane maintainers <docuvane@lomari.org>")
set(CPACK_PACKAGE_DESCRIPTION_SUMMARY "TeX documentation browser with a word index of (La)TeX commands")
string(CONCAT CPACK_PACKAGE_DESCRIPTION
       "Docuvane gathers the documents of an installed TeX distribution into one catalogue "
       "and keeps a word index of (La)TeX commands and environments that leads from a "
       "command name to the pages that document it.")
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_SECTION tex)
# The libraries the binaries link, as dpkg-shlibdeps finds them.
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
# Loaded when first needed, so not seen by dpkg-shlibdeps: downloads need libcurl.
set(CPACK_DEBIAN_PACKAGE_DEPENDS "libcurl4 | libcurl3-gnutls, libpoppler-glib8")
set(CPACK_DEBIAN_PACKAGE_RECOMMENDS "xdg-utils, evince | okular | zathura | mupdf | qpdfview | atril")
set(CPACK_DEBIAN_PACKAGE_SUGGESTS "texlive-latex-base-doc")
set(CPACK_PACKAGING_INSTALL_PREFIX /usr)
set(CPACK_STRIP_FILES ON)
include(CPack)

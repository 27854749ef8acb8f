// The TeX trees searched when TEXMF is not set.
#pragma once

#include <string>
#include <vector>

// The user's own tree, $VARTEX/texmf: the scanner writes the word index and
// the catalogue there, and it is searched first.
std::string UserTexTree();

// The TeX installation's trees that exist: TEXMFHOME, TEXMFLOCAL and
// TEXMFDIST as kpsewhich gives them, else the usual TeX Live locations.
// kpsewhich's answer is kept in $VARTEX/kpsewhich-trees, valid while
// kpsewhich itself, the texmf.cnf files it read and the variables it looks
// at stay the same, so that start-up costs a few stat calls instead of a
// process.  Empty when there is no TeX installation.
std::vector<std::string> InstalledTexTrees();

// What the trees are when TEXMF is unset: the user's tree then the
// installation's trees; when neither exists, just `sampleTree`.
std::vector<std::string> ChooseDefaultTrees(const std::string& userTree, bool userTreeExists,
                                            const std::vector<std::string>& installed,
                                            const std::string& sampleTree);

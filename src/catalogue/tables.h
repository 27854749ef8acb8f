// The process-wide tables, owned in one place.
#pragma once

// Empties every table that start-up fills (document table, keyword list
// and its pool, word index state and path, word counters, the highlighted
// tree item, the settings, the path search's caches), so that the settings,
// the word index and the catalogue can be loaded again in the same process.
// The callers' windows must be emptied first: they point into these tables.
void Clear_Tables();

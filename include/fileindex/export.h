/* What libfileindex exports: everything else in the library is hidden. */
#pragma once

#define FILEINDEX_EXPORT __attribute__((visibility("default")))

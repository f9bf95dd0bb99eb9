// Marks the declarations that libfileindex exports; everything else stays inside the library.
#ifndef FILEINDEX_EXPORT_H
#define FILEINDEX_EXPORT_H

#define FILEINDEX_EXPORT __attribute__((visibility("default")))

#endif

/** Marks what libzyrovfs gives to its callers; everything else in the library is hidden. */
#ifndef ZYROVFS_EXPORT_H
#define ZYROVFS_EXPORT_H

#define ZYROVFS_API __attribute__((visibility("default")))

#endif

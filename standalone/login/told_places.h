/* The folders that chroot rules lead to, and those on the way to them, as the program that makes the view
 * found them. Who moved one of them could put another in its place, and so show to others what their rules do
 * not give them. */
#ifndef VELT_STANDALONE_LOGIN_TOLD_PLACES_H
#define VELT_STANDALONE_LOGIN_TOLD_PLACES_H

/* Keeps the names of those in this file, and of what comes to stand in place of one, until the homes of the
 * login are forgotten. Of the texts ended by 0, three for each fact (standalone/activity/shown_places.h),
 * these are
 *
 *     "kept", a name, "DEVICE INODE DEVICE INODE" of the folder in which it is and of what has it there
 *     "absent", a name, "DEVICE INODE" of the folder in which nothing has it
 *
 * 0, or -1 with errno; also without a file (-1) there are none. */
int velt_keep_told_places(int file);

#endif

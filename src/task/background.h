/** A child that goes on after its caller's answer. */
#ifndef ZYROVFS_TASK_BACKGROUND_H
#define ZYROVFS_TASK_BACKGROUND_H

namespace ZYROVFS::task {

/**
 * In such a child: standard input, output and errors become /dev/null, by whatever numbers the
 * caller has them open. A web server waits for the end of its program's output until nobody has it
 * open any more. All other descriptors stay: they may be of use to what the child calls back.
 */
void LetGoOfOutput();

}  // namespace ZYROVFS::task

#endif

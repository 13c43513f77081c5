# The integration tests against the packages that are installed on this machine: nothing of the
# library is built, and where the tests look for a build tree's programs there are links.
set(CMAKE_FIND_PACKAGE_TARGETS_GLOBAL ON)
find_package(zyrovfs 6 REQUIRED)
add_library(zyrovfs ALIAS zyrovfs::zyrovfs)
add_library(zosplatform INTERFACE)
target_link_libraries(zosplatform INTERFACE zyrovfs::zosplatform)
target_include_directories(zosplatform INTERFACE ${PROJECT_SOURCE_DIR}/platform/include)

# link_to FILE PLACE: in the build tree
function(link_to file place)
  if(NOT EXISTS ${file})
    message(FATAL_ERROR "${file} is not installed")
  endif()
  get_filename_component(folder ${PROJECT_BINARY_DIR}/${place} DIRECTORY)
  file(MAKE_DIRECTORY ${folder})
  file(CREATE_LINK ${file} ${PROJECT_BINARY_DIR}/${place} SYMBOLIC)
endfunction()
link_to(/usr/bin/zyrovfs tools/zyrovfs/zyrovfs)
link_to(/usr/libexec/zyrovfs/zyrovfs-web web/zyrovfs-web)
link_to(/usr/libexec/zyrovfs/gvfsd-fuse-launcher platform/host/gvfsd-fuse-launcher)
link_to(/usr/share/zyrovfs/mounts platform/host/mounts)

enable_testing()
set(ZYROVFS_INTEGRATION_TESTS ON)
add_subdirectory(tests/support/xattrtree)
add_subdirectory(tests/support/cloudsim)
add_subdirectory(tests)

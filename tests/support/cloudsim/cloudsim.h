/**
 * Simulated cloud services on loopback, written from the services' public documentation.
 *
 *     cloudsim::BoxService box;
 *     cloudsim::Account& amy = box.AddAccount("amy@example.com");
 *     const cloudsim::Tokens tokens = amy.IssueTokens();
 *     const std::string id = amy.AddPath("/docs/a.txt", "hello");
 *     box.AddFault(cloudsim::Fault::On("GET", "/2.0/users/me").Answer(503).Times(2));
 *     ... a client at box.ApiHost() and box.UploadHost() ...
 *     EXPECT_EQ(1u, box.Journal().Count("GET", "/2.0/files/" + id));
 *     EXPECT_THAT(box.UnusedFaults(), IsEmpty());
 */
#ifndef ZYROVFS_TESTS_CLOUDSIM_CLOUDSIM_H
#define ZYROVFS_TESTS_CLOUDSIM_CLOUDSIM_H

#include "support/cloudsim/box.h"
#include "support/cloudsim/dropbox.h"
#include "support/cloudsim/gdrive.h"
#include "support/cloudsim/onedrive.h"

#endif

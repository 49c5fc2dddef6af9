// SPDX-License-Identifier: Apache-2.0
//
// Tells forged session cookies and access tokens from real ones before a request has a process, at the cost of a hash.
//
// Why so        A forged cookie would otherwise make the host fork, open the store and read a body of
//               megabytes. The host itself cannot open the store, so a child that can hands it the key.
#pragma once

#include <string>

#include "standalone/http/request.h"

namespace lookhaven::api {

class SessionFilter {
  public:
    // Throws std::system_error.
    SessionFilter();
    SessionFilter(const SessionFilter&) = delete;
    SessionFilter& operator=(const SessionFilter&) = delete;
    ~SessionFilter();

    // For the host's child that has opened the store: tells the host the store's session key. Call it again when the
    // store has been replaced, which gives it another key.
    void Learn(const std::string& key);

    // False: no cookie or access token is a secret of this store, so there is no session. True says only that one may
    // exist; it may have ended. Until the key is known, any well-formed secret counts.
    bool MayHaveSession(const http::Request& request) const;

    // For a request process: from now on nothing here can be reached, by code that a picture has taken over, either.
    // Nothing else may be called then.
    void Close();

  private:
    struct Page;

    Page* page_;  // shared with all children
};

}  // namespace lookhaven::api

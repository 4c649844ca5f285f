#pragma once

namespace QELO {

class APIRequest;

/// Whether a browser sent the request for a page of another site: such a page could log its visitor
/// in to an account of its own. Browsers say so in Sec-Fetch-Site, though on https alone; without
/// it the page's host, in Origin, must be the one that is called. Programs send neither.
bool comesFromAnotherSite(const APIRequest& request);

/// Whether the request was sent by POST. An entry of a compound request counts as one, so the
/// method that brought the whole request is looked at too.
bool isPost(const APIRequest& request);

}  // namespace QELO

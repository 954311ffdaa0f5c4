/// @file
/// The commands that the library gives to the search daemon.
///
/// Each call but GetAppIndexID is one request over "/var/run/tovoelasticd.sock", on a connection of
/// its own. It returns when the daemon has answered with success.
///
/// It blocks: up to 15 s while the socket file is missing; up to ten days while the daemon's queue
/// of connections is full, and until the reply comes; without limit while the daemon answers that
/// its database is not ready (codes 607, 608, 610: asked again every 30 s) or that it is busy
/// (1400: asked again after 15 to 19 minutes), each time with a line in the system log.
///
/// It throws Error 913 when the exchange fails ("Connect failed, req=", "Send failed, req=" or
/// "Recv failed, req=", the last for a malformed reply too), any other code of the daemon as it is
/// ("Request failed, msg=" and the daemon's text), and Error 120 when the daemon reports a failure
/// without a code or without a text. Each 913 and each code of the daemon is logged too, with the
/// whole request; the reasons of 913 hold it as well, documents and all. Acts with the caller's
/// effective user. Calls from several threads are independent.
#pragma once

#include <json/value.h>

#include <string>

#include "appindex/export.h"

/// The commands of the search daemon.
namespace velkor::appindex::elastic {

/// The id of the app index of a language: "appindex_" and the code, which is not checked.
TEISEIGATRO_EXPORT std::string GetAppIndexID(const std::string& lang);

/// Creates the empty app index of a language, with the fields of a search document. The daemon
/// decides what happens when there is one already.
TEISEIGATRO_EXPORT void AppIndexCreate(const std::string& lang);

/// Deletes the app index of a language with all its documents. Error 601 when there is none.
TEISEIGATRO_EXPORT void AppIndexDelete(const std::string& lang);

/// Inserts `doc` into the app index of a language, or replaces the document with the same "id".
/// `doc` is an object with the strings "id", "owner", "title", "desc", "keywords" and
/// "search_title"; only "id" is required here. Throws Error 120 before anything is sent when `doc`
/// is not an object, has no "id" or an "id" that is not a string. Not on disk before IndexCommit.
TEISEIGATRO_EXPORT void IndexUpsert(const std::string& lang, const Json::Value& doc);

/// Deletes the document with the id `doc_id`, which may be empty, from the app index of a language.
TEISEIGATRO_EXPORT void IndexDelete(const std::string& lang, const std::string& doc_id);

/// Makes the changes of the app index of a language lasting and visible to searches.
TEISEIGATRO_EXPORT void IndexCommit(const std::string& lang);

}  // namespace velkor::appindex::elastic

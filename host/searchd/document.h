// From the JSON document that a client sends to what is indexed and stored.
#pragma once

#include <json/value.h>
#include <xapian.h>

#include <string>

#include "host/searchd/analyzer.h"
#include "host/searchd/mapping.h"

namespace searchd {

constexpr std::size_t kMaxDocumentIdBytes = 4096;
constexpr std::size_t kMaxFieldBytes = 1024 * 1024;
constexpr Json::ArrayIndex kMaxDocumentMembers = 256;

// The slot whose values order documents of equal worth: by title, then by key.
constexpr Xapian::valueno kOrderSlot = 0;

// Throws RequestError(kRejected) naming the member that keeps `data` from being the document
// `document_id` under the mapping.
void CheckDocument(const Mapping& mapping, const std::string& document_id, const Json::Value& data);

// The index entry of a document that CheckDocument has accepted.
Xapian::Document BuildDocument(const Mapping& mapping, Analyzer& analyzer,
                               const std::string& document_id, const Json::Value& data);

}  // namespace searchd

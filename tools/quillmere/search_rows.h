// The rows a search found, as the host's database gives them: the search's
// SQL (its keys and its order clause filled in) run through the engine's data
// access, on the connection given to the host or else the one the statement's
// first findex was built with.
#pragma once

#include <string>

#include "command_registry.h"
#include "host_session.h"

namespace qm::cli {

// Prints the rows of the window of the open result set under a line of
// column names, aligned on a terminal and tab-separated otherwise. When the
// search was ordered (ordered_by_host: the host called OrderBy; or an ORDER
// BY inside the statement's brackets) and the findex's key column is among
// the columns, the rows follow the search's order exactly, ties included;
// otherwise they come as the SQL orders them (an ORDER BY of the statement's
// own SQL, say). Returns the exit status, after the message on a failure.
int PrintSearchRows(HostSession& session, const GlobalOptions& global,
                    const std::string& statement, bool ordered_by_host);

}  // namespace qm::cli

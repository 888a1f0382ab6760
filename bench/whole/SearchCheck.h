#pragma once
// Whether a search by name, the request each upload starts with, costs the
// same in a fresh group as in one whose files were each replaced ten times
// (a replaced file stays a trashed member of its group). Prints the result.

#include <filesystem>

#include <boost/json/object.hpp>

namespace wholebench {

// `work` holds the check's service and folders; it is removed when done.
boost::json::object RunSearchCheck(const std::filesystem::path& work);

}  // namespace wholebench

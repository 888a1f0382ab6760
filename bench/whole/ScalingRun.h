#pragma once
// The scaling run: the `tolmonetsync` command as whole processes against the
// `serve` process, 1,000 and 10,000 small files in one group, and a search by
// name in a fresh group beside one whose files were each replaced ten times.
// Prints its table and goals; gives its figures.

#include <filesystem>

#include <boost/json/object.hpp>

namespace wholebench {

// `work` holds the run's folders and services; each is removed when done.
boost::json::object RunScaling(const std::filesystem::path& work);

}  // namespace wholebench

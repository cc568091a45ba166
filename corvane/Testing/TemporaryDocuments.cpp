#include <corvane/Testing/TemporaryDocuments.h>

#include <corvane/Platform/DocumentsDirectory.h>

#include <cstdlib>
#include <stdexcept>

namespace corvane::test {

TemporaryDocuments::TemporaryDocuments() {
    std::string pattern = (std::filesystem::temp_directory_path() / "corvane-test-XXXXXX").string();
    if (!mkdtemp(pattern.data())) throw std::runtime_error("cannot make a temporary directory");
    path_ = pattern;
    DocumentsDirectory::set(path_);
}

TemporaryDocuments::~TemporaryDocuments() {
    DocumentsDirectory::set({});
    std::error_code ignored;
    std::filesystem::remove_all(path_, ignored);
}

}  // namespace corvane::test

#include "foundation/core/SecretServiceStore.h"

#include <dlfcn.h>

#include <memory>

namespace tolmocore {
namespace security {
namespace detail {
namespace {

// The few types and functions of the secret library and of the glib beneath
// it that are used here, declared as their stable C interface defines them;
// their headers stay out of the build.
struct GError {
    unsigned int domain;
    int code;
    char* message;
};
struct GList {
    void* data;
    GList* next;
    GList* prev;
};
struct SecretSchemaAttribute {
    const char* name;
    int type;  // 0: string
};
struct SecretSchema {
    const char* name;
    int flags;
    SecretSchemaAttribute attributes[32];
    int reserved;
    void* reserved1[7];
};

constexpr int kServiceOpenSession = 1 << 1;
constexpr int kSearchAll = 1 << 1;  // locked items too, so that they are reported, never unlocked
constexpr int kSearchLoadSecrets = 1 << 3;

const SecretSchema kSchema = {"tolmonetsync.Keychain", 0, {{"domain", 0}, {"account", 0}}, 0, {}};

struct SecretLibrary {
    void* (*service_get_sync)(int, void*, GError**);
    void* (*collection_for_alias_sync)(void*, const char*, int, void*, GError**);
    int (*collection_get_locked)(void*);
    int (*service_store_sync)(void*, const SecretSchema*, void*, const char*, const char*, void*, void*, GError**);
    GList* (*service_search_sync)(void*, const SecretSchema*, void*, int, void*, GError**);
    int (*item_get_locked)(void*);
    void* (*item_get_secret)(void*);
    int (*item_delete_sync)(void*, void*, GError**);
    void* (*value_new)(const char*, long, const char*);
    const char* (*value_get)(void*, unsigned long*);
    void (*value_unref)(void*);
    void* (*hash_table_new)(unsigned int (*)(const void*), int (*)(const void*, const void*));
    int (*hash_table_insert)(void*, void*, void*);
    void (*hash_table_unref)(void*);
    unsigned int (*str_hash)(const void*);
    int (*str_equal)(const void*, const void*);
    void (*list_free)(GList*);
    void (*object_unref)(void*);
    void (*error_free)(GError*);
};

const char kDefaultLibrary[] = "libsecret-1.so.0";
std::string sLibraryName = kDefaultLibrary;  // guarded by Keychain's mutex, as everything here
std::unique_ptr<SecretLibrary> sLibrary;

template <class Function>
bool Bind(void* handle, const char* name, Function& function, std::string& error)
{
    function = reinterpret_cast<Function>(::dlsym(handle, name));
    if (function == nullptr) error = "the secret library " + sLibraryName + " lacks " + name;
    return function != nullptr;
}

// Opened once and never closed: glib cannot be unloaded safely.
const SecretLibrary* Library(std::string& error)
{
    if (sLibrary) return sLibrary.get();
    void* handle = ::dlopen(sLibraryName.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (handle == nullptr) {
        const char* why = ::dlerror();
        error = "the system keychain needs " + sLibraryName +
                " (package libsecret-1-0): " + (why != nullptr ? why : "not found");
        return nullptr;
    }
    auto library = std::make_unique<SecretLibrary>();
    SecretLibrary& l = *library;
    const bool bound =
        Bind(handle, "secret_service_get_sync", l.service_get_sync, error) &&
        Bind(handle, "secret_collection_for_alias_sync", l.collection_for_alias_sync, error) &&
        Bind(handle, "secret_collection_get_locked", l.collection_get_locked, error) &&
        Bind(handle, "secret_service_store_sync", l.service_store_sync, error) &&
        Bind(handle, "secret_service_search_sync", l.service_search_sync, error) &&
        Bind(handle, "secret_item_get_locked", l.item_get_locked, error) &&
        Bind(handle, "secret_item_get_secret", l.item_get_secret, error) &&
        Bind(handle, "secret_item_delete_sync", l.item_delete_sync, error) &&
        Bind(handle, "secret_value_new", l.value_new, error) && Bind(handle, "secret_value_get", l.value_get, error) &&
        Bind(handle, "secret_value_unref", l.value_unref, error) &&
        Bind(handle, "g_hash_table_new", l.hash_table_new, error) &&
        Bind(handle, "g_hash_table_insert", l.hash_table_insert, error) &&
        Bind(handle, "g_hash_table_unref", l.hash_table_unref, error) &&
        Bind(handle, "g_str_hash", l.str_hash, error) && Bind(handle, "g_str_equal", l.str_equal, error) &&
        Bind(handle, "g_list_free", l.list_free, error) && Bind(handle, "g_object_unref", l.object_unref, error) &&
        Bind(handle, "g_error_free", l.error_free, error);
    if (!bound) return nullptr;
    sLibrary = std::move(library);
    return sLibrary.get();
}

// Takes the reason out of `failure` and frees it.
bool Failed(const SecretLibrary& library, const char* step, GError* failure, std::string& error)
{
    error = std::string("system keychain: ") + step;
    if (failure != nullptr && failure->message != nullptr) error += std::string(": ") + failure->message;
    if (failure != nullptr) library.error_free(failure);
    return false;
}

// One request to the service: the library, the connection, the attributes of
// an entry, and their release.
class Session {
public:
    Session(const UTF16String& domain, const UTF16String& account)
        : mDomain(utility::ToNarrow(domain)), mAccount(utility::ToNarrow(account))
    {
    }
    ~Session()
    {
        if (mAttributes != nullptr) mLibrary->hash_table_unref(mAttributes);
        if (mService != nullptr) mLibrary->object_unref(mService);
    }
    Session(const Session&) = delete;
    Session& operator=(const Session&) = delete;

    bool Open(std::string& error)
    {
        mLibrary = Library(error);
        if (mLibrary == nullptr) return false;
        GError* failure = nullptr;
        mService = mLibrary->service_get_sync(kServiceOpenSession, nullptr, &failure);
        if (mService == nullptr) return Failed(*mLibrary, "no Secret Service on the session bus", failure, error);
        mAttributes = mLibrary->hash_table_new(mLibrary->str_hash, mLibrary->str_equal);
        mLibrary->hash_table_insert(mAttributes, const_cast<char*>("domain"), const_cast<char*>(mDomain.c_str()));
        mLibrary->hash_table_insert(mAttributes, const_cast<char*>("account"), const_cast<char*>(mAccount.c_str()));
        return true;
    }

    // Storing into a locked collection would ask the user to unlock it.
    bool DefaultCollectionUnlocked(std::string& error)
    {
        GError* failure = nullptr;
        void* collection = mLibrary->collection_for_alias_sync(mService, "default", 0, nullptr, &failure);
        if (collection == nullptr)
            return failure != nullptr ? Failed(*mLibrary, "default collection", failure, error)
                                      : Failed(*mLibrary, "no default collection", nullptr, error);
        const bool locked = mLibrary->collection_get_locked(collection) != 0;
        mLibrary->object_unref(collection);
        return !locked || Failed(*mLibrary, "the default collection is locked", nullptr, error);
    }

    bool Store(const std::string& password, std::string& error)
    {
        if (!DefaultCollectionUnlocked(error)) return false;
        void* value = mLibrary->value_new(password.data(), static_cast<long>(password.size()), "text/plain");
        const std::string label = mDomain + " (" + mAccount + ")";
        GError* failure = nullptr;
        const bool stored = mLibrary->service_store_sync(mService, &kSchema, mAttributes, "default", label.c_str(),
                                                         value, nullptr, &failure) != 0;
        mLibrary->value_unref(value);
        return stored || Failed(*mLibrary, "store", failure, error);
    }

    // Every item of the entry, locked ones too; null with `error` set on failure.
    GList* Items(int flags, std::string& error)
    {
        GError* failure = nullptr;
        GList* items =
            mLibrary->service_search_sync(mService, &kSchema, mAttributes, kSearchAll | flags, nullptr, &failure);
        if (failure != nullptr) Failed(*mLibrary, "search", failure, error);
        return items;
    }
    void Release(GList* items)
    {
        for (GList* item = items; item != nullptr; item = item->next) mLibrary->object_unref(item->data);
        mLibrary->list_free(items);
    }

    const SecretLibrary* mLibrary = nullptr;
    void* mService = nullptr;

private:
    std::string mDomain, mAccount;
    void* mAttributes = nullptr;
};

}  // namespace

bool SecretServiceUsable(std::string& error)
{
    Session session{UTF16String(), UTF16String()};
    return session.Open(error) && session.DefaultCollectionUnlocked(error);
}

bool SecretServiceStore(const UTF16String& domain, const UTF16String& account, const UTF16String& password,
                        std::string& error)
{
    Session session(domain, account);
    return session.Open(error) && session.Store(utility::ToNarrow(password), error);
}

SecretLookup SecretServiceLookup(const UTF16String& domain, const UTF16String& account, UTF16String& password,
                                 std::string& error)
{
    Session session(domain, account);
    if (!session.Open(error)) return SecretLookup_Failed;
    error.clear();
    GList* items = session.Items(kSearchLoadSecrets, error);
    if (!error.empty()) return SecretLookup_Failed;
    SecretLookup result = SecretLookup_Missing;
    for (GList* item = items; item != nullptr && result == SecretLookup_Missing; item = item->next) {
        if (session.mLibrary->item_get_locked(item->data) != 0) {
            Failed(*session.mLibrary, "the entry is locked", nullptr, error);
            result = SecretLookup_Failed;
            continue;
        }
        void* value = session.mLibrary->item_get_secret(item->data);
        if (value == nullptr) continue;
        unsigned long length = 0;
        const char* text = session.mLibrary->value_get(value, &length);
        password = utility::ToUTF16(text != nullptr ? std::string(text, length) : std::string());
        session.mLibrary->value_unref(value);
        result = SecretLookup_Found;
    }
    session.Release(items);
    return result;
}

bool SecretServiceRemove(const UTF16String& domain, const UTF16String& account, std::string& error)
{
    Session session(domain, account);
    if (!session.Open(error)) return false;
    error.clear();
    GList* items = session.Items(0, error);
    bool removed = error.empty();
    for (GList* item = items; item != nullptr && removed; item = item->next) {
        GError* failure = nullptr;
        if (session.mLibrary->item_get_locked(item->data) != 0)
            removed = Failed(*session.mLibrary, "the entry is locked", nullptr, error);
        else if (session.mLibrary->item_delete_sync(item->data, nullptr, &failure) == 0)
            removed = Failed(*session.mLibrary, "delete", failure, error);
    }
    session.Release(items);
    return removed;
}

void SetSecretLibraryName(const std::string& name)
{
    sLibraryName = name.empty() ? kDefaultLibrary : name;
    sLibrary.reset();  // the handle stays open: see Library()
}

}  // namespace detail
}  // namespace security
}  // namespace tolmocore

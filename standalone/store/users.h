// SPDX-License-Identifier: Apache-2.0
//
// Accounts: who may log in, how much they may do, what is denied to them.
#pragma once

#include <initializer_list>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "standalone/store/store.h"

namespace lookhaven::store {

// Stands for a host admitted by pair matching; no account ever has this id.
constexpr int kPairedHostUserId = 1024;

enum class Privilege : int { kOwner = 0, kManager = 1, kViewer = 2 };

// What a user may be denied at a camera or a group of them; the numbers are stored. Export is of whole recordings as
// files, and needs the right to play them: a denial of playback is one of export, too.
enum class CameraAccess : int { kLive = 1, kPlayback = 2, kAudio = 8, kExport = 16 };
constexpr std::initializer_list<CameraAccess> kEveryAccess = {CameraAccess::kLive, CameraAccess::kPlayback,
                                                              CameraAccess::kAudio, CameraAccess::kExport};

// What else may be denied; the numbers are those of e-map items, and are stored.
enum class DeniableItem : int { kEmap = 1, kDoor = 2, kIoModule = 3 };

struct User {
    int id = 0;  // from 1, never used twice
    std::string name;
    Privilege privilege = Privilege::kViewer;
    bool may_mark_as_viewer = false;

    bool IsManager() const { return privilege <= Privilege::kManager; }
    // Whether the user may report alerts and POS transactions.
    bool MayMark() const { return IsManager() || may_mark_as_viewer; }
};

// What a user is denied, as a whole. A kind without ids may be missing.
struct Denials {
    std::map<CameraAccess, std::set<int>> cameras;  // by themselves, not as members of a group
    std::map<CameraAccess, std::set<int>> groups;
    std::map<DeniableItem, std::set<int>> items;
};

// Throws InvalidRecord unless the password has 8 to 1,024 bytes. Costs nothing, unlike its hash.
void RequirePassword(std::string_view password);

// A password as the store keeps it.
class HashedPassword {
  public:
    // Takes a tenth of a second and 64 MiB. Throws as RequirePassword does.
    explicit HashedPassword(std::string_view password);
    const std::string& Text() const { return text_; }

  private:
    std::string text_;
};

// A user whose password was right, with the hash that said so: it is gone once the password changes.
struct VerifiedUser : User {
    std::string password_hash;
};

// Invariants    (1) A change that takes a right away (password, privilege, denial, removal) ends the user's sessions
//                   with it. So does one of a group that is denied.
//               (2) Names are compared without regard to case; no account is called "Lookhaven".
class Users {
  public:
    // The store must outlive this object.
    explicit Users(Store& store) : connection_(store.connection()) {}

    // name: 1 to 64 ASCII letters, digits, ".", "_", "-", "@", the first a letter or digit. password: 8 to 1,024 bytes.
    // Takes a tenth of a second and 64 MiB, as does every use of a password. Throws InvalidRecord or AlreadyExists.
    User Add(std::string_view name, std::string_view password, Privilege privilege);
    User Add(std::string_view name, const HashedPassword& password, Privilege privilege);

    // The account when name and password are right. An unknown name costs as much as a wrong password. A lack of those
    // 64 MiB counts as a wrong one.
    std::optional<VerifiedUser> CheckPassword(std::string_view name, std::string_view password);

    std::optional<User> Find(int id);
    std::optional<User> FindByName(std::string_view name);
    std::vector<User> List();  // by id
    // Whether there is no account yet. Reads one row at most.
    bool IsEmpty();

    // Call inside InTransaction: until its end, other callers of this wait.
    void Lock();

    // These throw NotFound for an unknown id.
    void SetPassword(int id, std::string_view password);
    void SetPassword(int id, const HashedPassword& password);
    // The session of that handle stays. NotFound, too, when the password has changed since it was checked.
    void SetPassword(const VerifiedUser& user, const HashedPassword& password, std::string_view kept_session);
    void SetPrivilege(int id, Privilege privilege);
    // Throws NotFound, too, for an unknown group. Cameras and items need not exist.
    void SetDenials(int id, const Denials& denials);
    void Deny(int id, int camera_id, std::initializer_list<CameraAccess> kinds = kEveryAccess);
    void Allow(int id, int camera_id, std::initializer_list<CameraAccess> kinds = kEveryAccess);
    void DenyGroup(int id, int group_id, std::initializer_list<CameraAccess> kinds = kEveryAccess);
    void AllowGroup(int id, int group_id, std::initializer_list<CameraAccess> kinds = kEveryAccess);
    // item_id need not exist (yet, or any more).
    void DenyItem(int id, DeniableItem kind, int item_id);
    void AllowItem(int id, DeniableItem kind, int item_id);
    // A new account may not report marks, unless it is a manager's, which always may.
    void DenyMarks(int id);
    void AllowMarks(int id);
    void Remove(int id);

    // The cameras at which the user lacks that access, by themselves or as members of a denied group, or with what it
    // takes; empty for an unknown user.
    std::set<int> DeniedCameras(int id, CameraAccess kind);
    std::set<int> DeniedGroups(int id, CameraAccess kind);
    std::set<int> DeniedItems(int id, DeniableItem kind);
    Denials FindDenials(int id);

  private:
    Connection& connection_;
};

}  // namespace lookhaven::store

#pragma once

#include <cassert>
#include <iterator>
#include <set>

// An ordered collection of borrowed pointers with unique keys, ordered by a C-style comparison
// function (negative, zero, positive). It never deletes its elements: the owner does, with
// DeleteAll or after Remove. Lookups are logarithmic.
template <class T>
class KLSkipList {
  public:
    using Compare = int (*)(const void*, const void*);

    explicit KLSkipList(Compare compare) : set_(Less{compare}) { assert(compare); }

    // Inserts `e`; returns `e`, or null (and leaves the list unchanged) when an element that
    // compares equal is already there.
    T* Insert(T* e) { return set_.insert(e).second ? e : nullptr; }
    // Removes the element that compares equal to `probe` and returns it, or null.
    T* Remove(const T* probe) {
        auto it = set_.find(const_cast<T*>(probe));
        if (it == set_.end())
            return nullptr;
        T* e = *it;
        set_.erase(it);
        return e;
    }
    // The element that compares equal to `probe`, or null.
    T* Find(const T* probe) const {
        auto it = set_.find(const_cast<T*>(probe));
        return it == set_.end() ? nullptr : *it;
    }
    // The greatest element not above `probe`, or null when every element is above it.
    T* Search(const T* probe) const {
        auto it = set_.upper_bound(const_cast<T*>(probe));
        return it == set_.begin() ? nullptr : *std::prev(it);
    }
    // The first element above `probe`, or null.
    T* Following(const T* probe) const {
        auto it = set_.upper_bound(const_cast<T*>(probe));
        return it == set_.end() ? nullptr : *it;
    }
    T* Head() const { return set_.empty() ? nullptr : *set_.begin(); }
    T* Tail() const { return set_.empty() ? nullptr : *set_.rbegin(); }
    // The element after `e` (which is in the list), or null after the last.
    T* Next(const T* e) const { return Following(e); }
    // The element before `e`, or null before the first.
    T* Prev(const T* e) const {
        auto it = set_.lower_bound(const_cast<T*>(e));
        return it == set_.begin() ? nullptr : *std::prev(it);
    }

    int Count() const { return int(set_.size()); }
    bool Empty() const { return set_.empty(); }
    // Empties the list without touching the elements.
    void Clear() { set_.clear(); }
    // Deletes every element and empties the list.
    void DeleteAll() {
        for (T* e : set_)
            delete e;
        set_.clear();
    }

    // In-order iteration over the elements.
    auto begin() const { return set_.begin(); }
    auto end() const { return set_.end(); }

  private:
    struct Less {
        Compare compare;
        bool operator()(const T* a, const T* b) const { return compare(a, b) < 0; }
    };
    std::set<T*, Less> set_;
};

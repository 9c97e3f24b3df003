#pragma once

// Ordering functor for host objects, passed by value to the host's sorts.
// It compares through its delegate: itself unless set to another functor.
// Its own comparison, when the delegate is itself, orders by address.
template <class T> class Orb_SortFtor {
public:
  Orb_SortFtor() : m_pDelegate(this) {}
  explicit Orb_SortFtor(Orb_SortFtor const *delegate) : m_pDelegate(delegate ? delegate : this) {}
  // A copy of a functor that compares by itself compares by the copy; a copy
  // of one that delegates keeps the delegate.
  Orb_SortFtor(Orb_SortFtor const &other)
      : m_pDelegate(other.m_pDelegate == &other ? this : other.m_pDelegate) {}
  Orb_SortFtor &operator=(Orb_SortFtor const &other) {
    if (this == &other)
      return *this;
    m_pDelegate = other.m_pDelegate == &other ? this : other.m_pDelegate;
    return *this;
  }

  virtual bool operator()(T const *a, T const *b) const {
    if (m_pDelegate != this)
      return (*m_pDelegate)(a, b);
    return a < b;
  }
  virtual ~Orb_SortFtor() = default;

  void SetDelegate(Orb_SortFtor const *delegate) { m_pDelegate = delegate ? delegate : this; }
  Orb_SortFtor const *GetDelegate() const { return m_pDelegate; }

private:
  Orb_SortFtor const *m_pDelegate;
};

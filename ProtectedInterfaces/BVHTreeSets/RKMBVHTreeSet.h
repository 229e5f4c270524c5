#pragma once

#include "RKMBVHNodeIterator.h"
#include "RKMBVHTreeBuilder.h"
#include "RKMExport.h"
#include "RKMHTable_K_D.h"
#include "RKMListPtrRKMBVHNodeConst.h"
#include "RKMPolyBoundingVolume.h"
#include "RKMPolyDebugObjectTrace.h"
#include "RKMSysTypes.h"

class RKMBVHNode;
class RKMBVHNodeConst;
class RKMBVHTree;
class RKMBVHTreeSetObserver;
class RKMMathTransformation;
class RKMMutex;

/// The hierarchies of several placed objects (each an integer id and its own tree) under one overall
/// tree, rebuilt lazily the first time it is asked for after a change. The set makes one leaf per
/// object, whose volumes are the object tree's root volumes placed by the object's transformation.
/// Observers hear of every call that changes the set before it acts, also of one that then fails.
/// Iterating the set walks its leaves. A set cannot be copied.
class RKM_EXPORT RKMBVHTreeSet : public RKMBVHNodeIterator
{
public:
  typedef int Type;

  /// Type 0 also registers the set with the optional debug monitor.
  explicit RKMBVHTreeSet(RKMBVHTreeBuilder::SpatialOptimization optimization = RKMBVHTreeBuilder::Basic,
                         RKMPolyBoundingVolume::TypeID volumeType = RKMPolyBoundingVolume::TypeOBB, Type type = 0);
  RKMBVHTreeSet(const RKMBVHTreeSet &) = delete;
  RKMBVHTreeSet &operator=(const RKMBVHTreeSet &) = delete;
  /// Deletes the leaves (releasing the object trees) and the overall tree's inner nodes. Observers are
  /// released, not notified.
  ~RKMBVHTreeSet() override;

  RKMBVHNodeIterator &Begin() override;
  unsigned char End() const override;
  RKMBVHNodeIterator &operator++() override;
  RKMBVHNode *operator*() const override;
  /// The observers' OnCheckPoint answers combined by bitwise AND; −1 without observers.
  virtual int CheckPoint();

  /// Adds an object (one reference on tree taken). E_INVALIDARG for a null tree, E_FAIL for a tree
  /// without root, E_OUTOFMEMORY (nothing kept); for an id already present S_FALSE or E_FAIL as the id
  /// table answers, the new leaf taking part all the same.
  HRESULT AddTree(int id, RKMBVHTree *tree, const RKMMathTransformation *position);
  /// Removes an object and releases its tree. E_INVALIDARG for an unknown id.
  HRESULT RemoveTree(int id);
  /// Moves an object. E_INVALIDARG for an unknown id; E_OUTOFMEMORY with the object left where it was.
  HRESULT ModifyTreePosition(int id, const RKMMathTransformation *position);
  /// Flushes an object's tree. E_INVALIDARG for an unknown id.
  HRESULT FlushTree(int id);
  /// S_OK with the object's leaf, or E_FAIL.
  HRESULT GetObjectNode(int id, const RKMBVHNodeConst *&node) const;
  HRESULT DesactivateTree(int id);
  HRESULT ActivateTree(int id);
  HRESULT DeactivateAll();
  HRESULT ActivateAll();

  /// The overall tree with one reference added for the caller, rebuilt first when a change dropped it;
  /// null when no object is active, or when memory ran out while building it. Safe from several
  /// threads at once (it is built once).
  RKMBVHTree *GetTree();
  /// The object tree of a leaf of a set (no reference added); null without attribute.
  static RKMBVHTree *GetTree(const RKMBVHNodeConst &leaf);
  static unsigned char IsActivated(const RKMBVHNodeConst &leaf);
  /// −1 without attribute.
  static int GetObjectId(const RKMBVHNodeConst &leaf);
  /// The identity without attribute.
  static const RKMMathTransformation &GetPosition(const RKMBVHNodeConst &leaf);
  /// Null without attribute.
  static const RKMMathTransformation *GetTransformation(const RKMBVHNodeConst &leaf);
  Type GetType() const { return m_type; }

  void RegisterObserver(RKMBVHTreeSetObserver *observer);
  void UnregisterObserver(RKMBVHTreeSetObserver *observer);

protected:
  virtual HRESULT VirtualRemoveTree(int id);
  HRESULT ProtectedAddTree(int id, RKMBVHTree *tree, const RKMMathTransformation *position);
  HRESULT SetFlagOnTree(int id, int value);
  HRESULT SetFlagOnAll(int value);
  void OverAllTreeNeedsUpdate();
  void RebuildOverAllTree();
  /// Deletes the inner nodes under node (those with children), leaving the leaves alone.
  static void RecursivelyDestroyIntermediateNodes(RKMBVHNode *node);
  /// A new volume (the caller's): a clone of bv, or bv placed by T; null for a null bv or when memory
  /// runs out.
  static RKMPolyBoundingVolume *ApplySmartTransformation(const RKMPolyBoundingVolume *bv,
                                                         const RKMMathTransformation *T);

  static const RKMMathTransformation _Identity;

private:
  template <class Call>
  void Notify(Call call);
  RKMBVHNode *Leaf(int id) const;

  RKMBVHTreeBuilder::SpatialOptimization m_optimization;
  RKMPolyBoundingVolume::TypeID m_volumeType;
  RKMHTable_K_D m_leafById;
  RKMListPtrRKMBVHNodeConst m_leaves;
  int m_position = 1;
  RKMBVHTreeSetObserver *m_observers = nullptr;
  Type m_type;
  RKMBVHTree *m_overAllTree = nullptr;
  RKMMutex *m_mutex;
  RKMPolyDebugObjectTrace m_trace;
};

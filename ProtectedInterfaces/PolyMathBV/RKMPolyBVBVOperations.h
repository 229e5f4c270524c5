#pragma once

#include "RKMExport.h"
#include "RKMSysTypes.h"

class RKMMathTransformation;
class RKMMathVector;
class RKMPolyBoundingVolume;

/// Operations on pairs of volumes of any kinds, each placed by its transformation (null: identity) in
/// a common frame; the tolerance enlarges the first volume. Every answer errs on the safe side: an
/// overlap is never missed, minimum distances are never above and maximum distances never below the
/// true ones, and an absorbing volume contains what it absorbed. Null volumes give false, −1 or 0.
class RKM_EXPORT RKMPolyBVBVOperations
{
public:
  /// Closed overlap test (touching counts).
  static unsigned char BVOverLap(const RKMPolyBoundingVolume *bv1, const RKMPolyBoundingVolume *bv2, double tolerance,
                                 const RKMMathTransformation *T1, const RKMMathTransformation *T2);
  /// bv1 unplaced, bv2 placed by T; false when either volume is empty.
  static unsigned char BVOverLapOnePos(const RKMPolyBoundingVolume *bv1, const RKMPolyBoundingVolume *bv2,
                                       double tolerance, const RKMMathTransformation *T);
  /// bv1 against bv2 translated by v.
  static unsigned char BVOverLapOnePos(const RKMPolyBoundingVolume *bv1, const RKMPolyBoundingVolume *bv2,
                                       const RKMMathVector &v, double tolerance);
  static unsigned char BVOverlapNoPos(const RKMPolyBoundingVolume *bv1, const RKMPolyBoundingVolume *bv2,
                                      double tolerance);

  /// 0 when the volumes overlap; −1 for a null or empty volume.
  static double GetMinimumDistance(const RKMPolyBoundingVolume *bv1, const RKMPolyBoundingVolume *bv2,
                                   double tolerance, const RKMMathTransformation *T1, const RKMMathTransformation *T2);
  static double GetSquareMinimumDistance(const RKMPolyBoundingVolume *bv1, const RKMPolyBoundingVolume *bv2,
                                         double tolerance, const RKMMathTransformation *T1,
                                         const RKMMathTransformation *T2);
  /// The largest distance between points of the two volumes; 1e40 with a slab, 1e30 with an infinite
  /// cylinder; −1 for a null or empty volume.
  static double GetMaximumDistance(const RKMPolyBoundingVolume *bv1, const RKMPolyBoundingVolume *bv2,
                                   double tolerance, const RKMMathTransformation *T1, const RKMMathTransformation *T2);
  static double GetSquareMaximumDistance(const RKMPolyBoundingVolume *bv1, const RKMPolyBoundingVolume *bv2,
                                         double tolerance, const RKMMathTransformation *T1,
                                         const RKMMathTransformation *T2);
  /// Whether bv1 moved along the line of direction (either sense) meets bv2, with the squared travel
  /// in squareDistance (0 when they overlap already; untouched when they never meet). A null direction
  /// answers true with 0 only for overlapping volumes, false otherwise. false for null or empty volumes.
  static unsigned char GetSquareMinDirDistance(const RKMPolyBoundingVolume *bv1, const RKMPolyBoundingVolume *bv2,
                                               const RKMMathVector &direction, double &squareDistance,
                                               double tolerance, const RKMMathTransformation *T1,
                                               const RKMMathTransformation *T2, double boxTolerance = 0.0);
  /// A measure of the volume that encloses both (the ranking the hierarchy builders use); 0 for null.
  static double GetVolumeOfUnion(const RKMPolyBoundingVolume *bv1, const RKMPolyBoundingVolume *bv2);
  /// Grows target to contain other. S_OK when it changed, S_FALSE when it contained other already (or
  /// other is null or empty), E_FAIL when no volume of the target's kind can contain other (a slab or an
  /// infinite cylinder into a bounded kind) or the target is null: the target is then unchanged.
  static HRESULT Absorb(RKMPolyBoundingVolume *target, const RKMPolyBoundingVolume *other);
};

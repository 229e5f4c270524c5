#include <fcl/fcl.h>

#include <chrono>
#include <memory>

#include "RKMClashBenchPeers.h"

namespace
{
template <class BV> std::shared_ptr<fcl::BVHModel<BV>> Model(const BenchSoup &s)
{
  std::vector<fcl::Vector3d> v;
  v.reserve(s.vertices.size());
  for (const auto &p : s.vertices)
    v.emplace_back(p[0], p[1], p[2]);
  std::vector<fcl::Triangle> t;
  t.reserve(s.triangles.size());
  for (const auto &f : s.triangles)
    t.emplace_back(static_cast<size_t>(f[0]), static_cast<size_t>(f[1]), static_cast<size_t>(f[2]));
  auto m = std::make_shared<fcl::BVHModel<BV>>();
  m->beginModel();
  m->addSubModel(v, t);
  m->endModel();
  return m;
}

template <class BV> BenchPeerResult Run(const std::vector<BenchSoup> &scene)
{
  BenchPeerResult r;
  const auto t0 = std::chrono::steady_clock::now();
  std::vector<std::shared_ptr<fcl::BVHModel<BV>>> models;
  for (const BenchSoup &s : scene)
    models.push_back(Model<BV>(s));
  const auto t1 = std::chrono::steady_clock::now();
  for (size_t i = 0; i < scene.size(); ++i)
    for (size_t j = i + 1; j < scene.size(); ++j)
    {
      fcl::CollisionObjectd oi(models[i]), oj(models[j]);
      fcl::CollisionRequestd request(100000000, false);
      fcl::CollisionResultd result;
      fcl::collide(&oi, &oj, request, result);
      for (size_t k = 0; k < result.numContacts(); ++k)
        r.contacts.push_back({static_cast<int>(i), static_cast<int>(j), static_cast<int>(result.getContact(k).b1),
                              static_cast<int>(result.getContact(k).b2)});
    }
  const auto t2 = std::chrono::steady_clock::now();
  r.buildSeconds = std::chrono::duration<double>(t1 - t0).count();
  r.querySeconds = std::chrono::duration<double>(t2 - t1).count();
  return r;
}
} // namespace

BenchPeerResult FclClash(const std::vector<BenchSoup> &scene, bool obbrss)
{
  return obbrss ? Run<fcl::OBBRSSd>(scene) : Run<fcl::AABBd>(scene);
}

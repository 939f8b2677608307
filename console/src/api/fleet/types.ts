/// Names for the documents of the centre's interface, whose types are generated from its description.
import type { components } from '../../generated/centre';

type Schemas = components['schemas'];

export type FleetHost = Schemas['Host'];
export type HostState = Schemas['HostState'];
export type HostPage = Schemas['HostList'];
export type FleetOrder = Schemas['OrderList']['orders'][number];
/// What the feed tells of a host, and of an order.
export type HostNews = Schemas['HostEvent'];
export type OrderNews = Schemas['OrderEvent'];
export type Rollout = Schemas['Rollout'];
export type RolloutCounts = Schemas['Counts'];
/// A host's part in a roll-out.
export type RolloutPart = Schemas['Part'];
/// Who asks, and what their certificate allows. `*` stands for any characters in its lists.
export type Operator = Schemas['Operator'];
